#include "pictures/npy_writer.h"

#include <fmt/format.h>

#include "raster/pixel_types.h"

namespace lumo::host {
namespace {

constexpr std::uint64_t kMostHeader = 256;

template <typename T>
struct TypeLetter {
  static constexpr char value = std::is_floating_point_v<T> ? 'f' : std::is_signed_v<T> ? 'i' : 'u';
};
template <typename T>
struct TypeLetter<Complex<T>> {
  static constexpr char value = 'c';
};

/// The element type as numpy writes it: "<u2".
std::string TypeText(unsigned dataType) {
  std::string text;
  DispatchType(TwelveTypes{}, dataType, [&]<typename T>() {
    text = fmt::format("{}{}{}", sizeof(T) == 1 ? '|' : '<', TypeLetter<T>::value, sizeof(T));
    return true;
  });
  return text;
}

std::string Shape(const SubRect& rect, unsigned bands, Interleave interleave) {
  switch (interleave) {
    case Interleave::BIL:
      return fmt::format("({}, {}, {})", rect.Height(), bands, rect.Width());
    case Interleave::BSQ:
      return fmt::format("({}, {}, {})", bands, rect.Height(), rect.Width());
    default:
      return fmt::format("({}, {}, {})", rect.Height(), rect.Width(), bands);
  }
}

}  // namespace

std::string MakeNpyHeader(unsigned dataType, const SubRect& rect, unsigned bands,
                          Interleave interleave) {
  std::string dictionary = fmt::format("{{'descr': '{}', 'fortran_order': False, 'shape': {}, }}",
                                       TypeText(dataType), Shape(rect, bands, interleave));
  constexpr std::size_t kPreamble = 10;
  constexpr std::size_t kAlign = 64;
  dictionary.append(kAlign - 1 - (kPreamble + dictionary.size()) % kAlign, ' ').append("\n");
  std::string header("\x93NUMPY\x01\x00", 8);
  header += static_cast<char>(dictionary.size() & 0xFFU);
  header += static_cast<char>(dictionary.size() >> 8U);
  return header + dictionary;
}

NpyWriter::NpyWriter(const OutputFile& output, unsigned dataType, const SubRect& rect,
                     unsigned bands, Interleave interleave, bool isRaw)
    : file_(output),
      elementBytes_(DataTypeBytes(dataType)),
      rect_(rect),
      bands_(bands),
      interleave_(interleave) {
  if (isRaw) return;
  const std::string header = MakeNpyHeader(dataType, rect, bands, interleave);
  file_.Write(header.data(), header.size());
  start_ = header.size();
}

std::uint64_t NpyWriter::GetBytes(unsigned dataType, const SubRect& rect, unsigned bands) {
  return std::uint64_t{rect.Width()} * rect.Height() * bands * DataTypeBytes(dataType) +
         kMostHeader;
}

void NpyWriter::WriteRun(std::uint64_t element, const unsigned char*& pixels, std::uint64_t count) {
  file_.WriteAt(start_ + element * elementBytes_, pixels, count * elementBytes_);
  pixels += count * elementBytes_;
}

void NpyWriter::Write(const SubRect& rect, const BandSpan& bands, const unsigned char* pixels) {
  const std::uint64_t width = rect_.Width();
  const std::uint64_t x = rect.left - rect_.left;
  const std::uint64_t y = rect.top - rect_.top;
  const bool wholeLines = rect.Width() == rect_.Width();
  // Lines that are whole lie behind one another in the file as in the block.
  const unsigned runs = wholeLines ? 1 : rect.Height();
  const std::uint64_t run = std::uint64_t{rect.Width()} * (wholeLines ? rect.Height() : 1);
  if (interleave_ == Interleave::BSQ) {
    for (unsigned band = bands.first; band < bands.first + bands.count; ++band) {
      for (unsigned i = 0; i < runs; ++i) {
        WriteRun((std::uint64_t{band} * rect_.Height() + y + i) * width + x, pixels, run);
      }
    }
  } else if (interleave_ == Interleave::BIL && !wholeLines) {
    for (unsigned i = 0; i < rect.Height(); ++i) {
      for (unsigned band = 0; band < bands_; ++band) {
        WriteRun(((y + i) * bands_ + band) * width + x, pixels, rect.Width());
      }
    }
  } else {
    for (unsigned i = 0; i < runs; ++i) {
      WriteRun(((y + i) * width + x) * bands_, pixels, run * bands_);
    }
  }
}

}  // namespace lumo::host

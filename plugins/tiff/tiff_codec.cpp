#include "tiff/tiff_codec.h"

#include <array>
#include <cstring>
#include <libdeflate.h>
#include <memory>
#include <vector>
#include <zstd.h>

namespace lumo::tiff {
namespace {

struct InflaterDeleter {
  void operator()(libdeflate_decompressor* inflater) const {
    libdeflate_free_decompressor(inflater);
  }
};

bool Inflate(const unsigned char* packed, std::size_t packedBytes, unsigned char* out,
             std::size_t bytes) {
  thread_local const std::unique_ptr<libdeflate_decompressor, InflaterDeleter> inflater(
      libdeflate_alloc_decompressor());
  return inflater != nullptr && libdeflate_zlib_decompress(inflater.get(), packed, packedBytes, out,
                                                           bytes, nullptr) == LIBDEFLATE_SUCCESS;
}

struct ZstdDeleter {
  void operator()(ZSTD_DCtx* context) const { ZSTD_freeDCtx(context); }
};

bool UnpackZstd(const unsigned char* packed, std::size_t packedBytes, unsigned char* out,
                std::size_t bytes) {
  thread_local const std::unique_ptr<ZSTD_DCtx, ZstdDeleter> context(ZSTD_createDCtx());
  return context != nullptr &&
         ZSTD_decompressDCtx(context.get(), out, bytes, packed, packedBytes) == bytes;
}

/// Reads codes of 9 to 12 bits, the highest bit first.
class CodeReader {
 public:
  CodeReader(const unsigned char* bytes, std::size_t count) : at_(bytes), end_(bytes + count) {}

  /// The next code; kNone behind the last.
  unsigned Next(unsigned bits) {
    while (held_ < bits) {
      if (at_ == end_) return kNone;
      if (end_ - at_ >= 4) {
        std::uint32_t word = 0;
        std::memcpy(&word, at_, 4);
        bits_ = bits_ << 32 | __builtin_bswap32(word);
        at_ += 4, held_ += 32;
      } else {
        bits_ = bits_ << 8 | *at_++;
        held_ += 8;
      }
    }
    held_ -= bits;
    return static_cast<unsigned>(bits_ >> held_) & ((1U << bits) - 1);
  }

  static constexpr unsigned kNone = ~0U;

 private:
  const unsigned char* at_;
  const unsigned char* const end_;
  std::uint64_t bits_ = 0;
  unsigned held_ = 0;
};

/// LZW as the TIFF specification has it (TIFF 6.0, 1992, section 13). Each string of the table is a
/// place in what has come out already: it is the one before with the byte that followed it.
bool UnpackLzw(const unsigned char* packed, std::size_t packedBytes, unsigned char* out,
               std::size_t bytes) {
  constexpr unsigned kClear = 256, kEnd = 257, kFirst = 258, kMost = 4096;
  struct String {
    std::uint32_t offset;
    std::uint32_t length;
  };
  thread_local std::array<String, kMost> strings;
  if (bytes > UINT32_MAX || packedBytes < 2 || (packed[0] == 0 && (packed[1] & 1) != 0)) {
    return false;  // an older form has its bits the other way round
  }
  CodeReader codes(packed, packedBytes);
  std::size_t done = 0;
  unsigned bits = 9, next = kFirst;
  std::uint32_t lastOffset = 0, lastLength = 0;  // of the string before; none after a clear code
  while (done < bytes) {
    const unsigned code = codes.Next(bits);
    if (code == kClear) {
      bits = 9, next = kFirst, lastLength = 0;
      continue;
    }
    if (code == kEnd || code == CodeReader::kNone) return false;
    const auto start = static_cast<std::uint32_t>(done);
    std::uint32_t length = 1;
    if (code < kClear) {
      out[done] = static_cast<unsigned char>(code);
    } else {
      if (lastLength == 0 || code > next || (code == next && next >= kMost)) return false;
      const String from = code < next ? strings[code] : String{lastOffset, lastLength + 1};
      length = static_cast<std::uint32_t>(std::min<std::size_t>(from.length, bytes - done));
      const unsigned char* const source = out + from.offset;
      unsigned char* const target = out + done;
      if (source + length <= target && length >= 16) {
        std::memcpy(target, source, length);
      } else {
        for (std::uint32_t i = 0; i < length; ++i) target[i] = source[i];
      }
    }
    done += length;
    if (lastLength != 0 && next < kMost) {
      strings[next] = {lastOffset, lastLength + 1};
      ++next;
      // Codes get longer one entry early.
      if (next >= (1U << bits) - 1 && bits < 12) ++bits;
    }
    lastOffset = start, lastLength = length;
  }
  return true;
}

template <typename T>
void Accumulate(unsigned char* row, std::size_t count, std::size_t stride) {
  const auto at = [row](std::size_t i) {
    T value;
    std::memcpy(&value, row + i * sizeof(T), sizeof(T));
    return value;
  };
  const auto put = [row](std::size_t i, T value) {
    std::memcpy(row + i * sizeof(T), &value, sizeof(T));
  };
  if (stride == 1) {
    T sum = 0;
    for (std::size_t i = 0; i < count; ++i) put(i, sum = static_cast<T>(sum + at(i)));
    return;
  }
  for (std::size_t i = stride; i < count; ++i) put(i, static_cast<T>(at(i) + at(i - stride)));
}

/// Bytes of floating-point numbers lie by their weight, the highest ones first, as differences.
void UndoFloats(const Prediction& prediction, unsigned char* row, std::size_t bytes) {
  thread_local std::vector<unsigned char> planes;
  Accumulate<std::uint8_t>(row, bytes, prediction.stride);
  planes.assign(row, row + bytes);
  const std::size_t each = prediction.elementBytes, count = bytes / each;
  for (std::size_t byte = 0; byte < each; ++byte) {
    const unsigned char* const plane = planes.data() + (each - 1 - byte) * count;
    for (std::size_t i = 0; i < count; ++i) row[i * each + byte] = plane[i];
  }
}

}  // namespace

bool IsKnown(std::uint64_t compression) {
  switch (static_cast<Compression>(compression)) {
    case Compression::kNone:
    case Compression::kLzw:
    case Compression::kDeflate:
    case Compression::kOldDeflate:
    case Compression::kZstd:
      return compression <= UINT16_MAX;
  }
  return false;
}

bool Decode(Compression compression, const unsigned char* packed, std::size_t packedBytes,
            unsigned char* out, std::size_t bytes) {
  switch (compression) {
    case Compression::kNone:
      if (packedBytes < bytes) return false;
      std::memcpy(out, packed, bytes);
      return true;
    case Compression::kLzw:
      return UnpackLzw(packed, packedBytes, out, bytes);
    case Compression::kDeflate:
    case Compression::kOldDeflate:
      return Inflate(packed, packedBytes, out, bytes);
    case Compression::kZstd:
      return UnpackZstd(packed, packedBytes, out, bytes);
  }
  return false;
}

void Undo(const Prediction& prediction, unsigned char* row, std::size_t bytes) {
  if (prediction.predictor == 3) return UndoFloats(prediction, row, bytes);
  if (prediction.predictor != 2) return;
  const std::size_t count = bytes / prediction.elementBytes;
  switch (prediction.elementBytes) {
    case 1:
      return Accumulate<std::uint8_t>(row, count, prediction.stride);
    case 2:
      return Accumulate<std::uint16_t>(row, count, prediction.stride);
    case 4:
      return Accumulate<std::uint32_t>(row, count, prediction.stride);
    default:
      return Accumulate<std::uint64_t>(row, count, prediction.stride);
  }
}

}  // namespace lumo::tiff

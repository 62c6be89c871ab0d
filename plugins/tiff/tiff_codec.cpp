#include "tiff/tiff_codec.h"

#include <algorithm>
#include <array>
#include <bit>
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

constexpr unsigned kMost = 4096;  // strings that the table of LZW holds

/// One of them. Short ones are at hand as a number, since bytes that have just
/// been written are slow to be read again.
struct Piece {
  std::uint64_t bytes;   // the first eight, the first one lowest
  std::uint32_t offset;  // of a place where it has come out; without a meaning for single bytes
  std::uint32_t length;

  /// The string with one byte more.
  Piece With(std::uint64_t byte) const {
    const std::uint64_t more = length < sizeof bytes ? byte << (8 * length) : 0;
    return {bytes | more, offset, length + 1};
  }
};

/// LZW as the TIFF specification has it (TIFF 6.0, 1992, section 13). Each new string of the table
/// is the one that came out before, with the byte that followed it.
/// @param table  kMost strings, which have no meaning yet.
[[gnu::noinline]] bool UnpackLzw(const unsigned char* packed, std::size_t packedBytes,
                                 unsigned char* out, std::size_t bytes, Piece* table) {
  constexpr unsigned kClear = 256, kEnd = 257, kFirst = 258;
  constexpr std::size_t kStep = sizeof(std::uint64_t);
  static_assert(std::endian::native == std::endian::little);
  if (bytes > UINT32_MAX || packedBytes < 2 || (packed[0] == 0 && (packed[1] & 1) != 0)) {
    return false;  // an older form has its bits the other way round
  }
  for (unsigned i = 0; i < kClear; ++i) table[i] = {i, 0, 1};
  CodeReader codes(packed, packedBytes);
  std::size_t done = 0;
  unsigned bits = 9, next = kFirst;
  Piece last{0, 0, 0};  // none after a clear code
  while (done < bytes) {
    const unsigned code = codes.Next(bits);
    if (code == kClear) {
      bits = 9, next = kFirst, last.length = 0;
      continue;
    }
    Piece piece = table[code < kMost ? code : 0];
    if (last.length != 0) {
      // A code may be the one of the string that it completes.
      if (code == next) piece = last.With(last.bytes & 0xFF);
      if (code > next || code == kEnd || code >= kMost) return false;
      if (next < kMost) {
        table[next] = last.With(piece.bytes & 0xFF);
        ++next;
        // Codes get longer one entry early.
        if (next >= (1U << bits) - 1 && bits < 12) ++bits;
      }
    } else if (code >= kClear) {
      return false;
    }
    unsigned char* const to = out + done;
    if (piece.length <= kStep && bytes - done >= kStep) {
      std::memcpy(to, &piece.bytes, kStep);  // what is too much is written over
    } else if (piece.length <= kStep) {
      piece.length = static_cast<std::uint32_t>(std::min<std::size_t>(piece.length, bytes - done));
      std::memcpy(to, &piece.bytes, piece.length);
    } else {
      piece.length = static_cast<std::uint32_t>(std::min<std::size_t>(piece.length, bytes - done));
      const unsigned char* const from = out + piece.offset;
      for (std::uint32_t i = 0; i < piece.length; ++i) to[i] = from[i];
    }
    last = {piece.bytes, static_cast<std::uint32_t>(done), piece.length};
    done += piece.length;
  }
  return true;
}

/// A table of this thread. It is looked up once for a block: in a loop the look-up costs more than
/// a code.
Piece* LzwTable() {
  thread_local std::vector<Piece> table(kMost);
  return table.data();
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
    case Compression::kJpeg:
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
      return UnpackLzw(packed, packedBytes, out, bytes, LzwTable());
    case Compression::kDeflate:
    case Compression::kOldDeflate:
      return Inflate(packed, packedBytes, out, bytes);
    case Compression::kZstd:
      return UnpackZstd(packed, packedBytes, out, bytes);
    case Compression::kJpeg:
      return false;
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

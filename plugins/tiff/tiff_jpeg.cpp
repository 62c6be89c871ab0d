#include "tiff/tiff_jpeg.h"

#include <algorithm>
#include <csetjmp>
#include <cstdio>
// It needs the declarations of the header before.
#include <jpeglib.h>

namespace lumo::tiff {
namespace {

/// Where errors of the library come back to whoever called it.
struct Return {
  explicit Return(jpeg_error_mgr*& handler) {
    handler = jpeg_std_error(&errors);
    errors.error_exit = [](j_common_ptr common) {
      std::longjmp(static_cast<Return*>(common->client_data)->place, 1);
    };
    errors.output_message = [](j_common_ptr) {};
  }
  Return(const Return&) = delete;
  Return& operator=(const Return&) = delete;

  jpeg_error_mgr errors{};
  std::jmp_buf place;
};

/// A decoder of the library.
struct Decoder {
  Decoder() : back(info.err) {
    info.client_data = &back;
    if (setjmp(back.place) != 0) return;
    jpeg_create_decompress(&info);
    isUsable = true;
  }
  ~Decoder() { jpeg_destroy_decompress(&info); }
  Decoder(const Decoder&) = delete;
  Decoder& operator=(const Decoder&) = delete;

  jpeg_decompress_struct info{};
  Return back;
  bool isUsable = false;
};

Decoder& ThreadDecoder() {
  thread_local Decoder decoder;
  return decoder;
}

bool HasForm(const jpeg_decompress_struct& info, const JpegForm& form, unsigned width,
             unsigned height) {
  bool isSampled = true;
  for (int i = 0; i < info.num_components; ++i) {
    const jpeg_component_info& component = info.comp_info[i];
    const bool isFirst = i == 0;
    isSampled = isSampled &&
                component.h_samp_factor == static_cast<int>(isFirst ? form.acrossSampling : 1) &&
                component.v_samp_factor == static_cast<int>(isFirst ? form.downSampling : 1);
  }
  return isSampled && info.image_width == width && info.image_height == height &&
         info.num_components == static_cast<int>(form.components) && info.data_precision == 8 &&
         info.progressive_mode == FALSE && info.arith_code == FALSE;
}

/// The part of DecodeJpeg that an error of the library leaves at once: nothing in it has to be let
/// go.
bool Run(Decoder& decoder, const JpegForm& form, unsigned width, unsigned height,
         const unsigned char* packed, std::size_t packedBytes, unsigned char* out) {
  jpeg_decompress_struct& info = decoder.info;
  if (setjmp(decoder.back.place) != 0) {
    jpeg_abort_decompress(&info);
    return false;
  }
  decoder.back.errors.num_warnings = 0;
  if (!form.tables.empty()) {
    jpeg_mem_src(&info, form.tables.data(), form.tables.size());
    if (jpeg_read_header(&info, FALSE) != JPEG_HEADER_TABLES_ONLY) return false;
  }
  jpeg_mem_src(&info, packed, packedBytes);
  if (jpeg_read_header(&info, TRUE) != JPEG_HEADER_OK || !HasForm(info, form, width, height)) {
    jpeg_abort_decompress(&info);
    return false;
  }
  info.jpeg_color_space = form.isYcc ? JCS_YCbCr : JCS_UNKNOWN;
  info.out_color_space = form.isYcc ? JCS_RGB : JCS_UNKNOWN;
  jpeg_start_decompress(&info);
  const std::size_t rowBytes = std::size_t{width} * form.components;
  while (info.output_scanline < height) {
    JSAMPROW row = out + info.output_scanline * rowBytes;
    jpeg_read_scanlines(&info, &row, 1);
  }
  jpeg_finish_decompress(&info);
  return decoder.back.errors.num_warnings == 0;
}

/// Calls `visit(marker, bytes, count)` for the segments of a stream. False for one that is damaged.
template <typename Visit>
bool VisitSegments(const std::vector<unsigned char>& stream, const Visit& visit) {
  constexpr unsigned char kMark = 0xFF, kStart = 0xD8, kEnd = 0xD9;
  if (stream.size() < 4 || stream[0] != kMark || stream[1] != kStart) return false;
  for (std::size_t at = 2; at + 2 <= stream.size();) {
    if (stream[at] != kMark) return false;
    const unsigned char marker = stream[at + 1];
    if (marker == kEnd) return true;
    if (at + 4 > stream.size()) return false;
    const std::size_t count = stream[at + 2] * 256U + stream[at + 3];
    if (count < 2 || at + 2 + count > stream.size()) return false;
    visit(marker, stream.data() + at + 4, count - 2);
    at += 2 + count;
  }
  return false;
}

constexpr std::size_t kTableSize = 64;

/// Gives the first two quantization tables that the library makes of a quality, in the order of a
/// stream. False when it can't.
bool MakeTables(unsigned quality, unsigned short (&tables)[2][kTableSize]) {
  // The places of a block by frequency (ITU-T T.81, figure A.6).
  static constexpr unsigned char kZigzag[kTableSize] = {
      0,  1,  8,  16, 9,  2,  3,  10, 17, 24, 32, 25, 18, 11, 4,  5,  12, 19, 26, 33, 40, 48,
      41, 34, 27, 20, 13, 6,  7,  14, 21, 28, 35, 42, 49, 56, 57, 50, 43, 36, 29, 22, 15, 23,
      30, 37, 44, 51, 58, 59, 52, 45, 38, 31, 39, 46, 53, 60, 61, 54, 47, 55, 62, 63};
  jpeg_compress_struct info{};
  Return back(info.err);
  info.client_data = &back;
  if (setjmp(back.place) != 0) {
    jpeg_destroy_compress(&info);
    return false;
  }
  jpeg_create_compress(&info);
  jpeg_set_quality(&info, static_cast<int>(quality), FALSE);
  for (unsigned table = 0; table < 2; ++table) {
    for (std::size_t i = 0; i < kTableSize; ++i) {
      tables[table][i] = info.quant_tbl_ptrs[table]->quantval[kZigzag[i]];
    }
  }
  jpeg_destroy_compress(&info);
  return true;
}

/// A table as a segment of a stream has it: with two bytes to a value where one doesn't do.
std::vector<unsigned char> SegmentOf(const unsigned short (&table)[kTableSize], unsigned number) {
  const bool isWide =
      std::any_of(table, table + kTableSize, [](auto value) { return value > 255; });
  std::vector<unsigned char> segment{static_cast<unsigned char>((isWide ? 16 : 0) + number)};
  for (const unsigned short value : table) {
    if (isWide) segment.push_back(static_cast<unsigned char>(value >> 8));
    segment.push_back(static_cast<unsigned char>(value & 255));
  }
  return segment;
}

}  // namespace

bool DecodeJpeg(const JpegForm& form, unsigned width, unsigned height, const unsigned char* packed,
                std::size_t packedBytes, unsigned char* out) {
  Decoder& decoder = ThreadDecoder();
  return decoder.isUsable && Run(decoder, form, width, height, packed, packedBytes, out);
}

std::optional<JpegTables> FindJpegTables(const JpegForm& form) {
  constexpr unsigned char kQuantization = 0xDB, kHuffman = 0xC4;
  std::vector<std::vector<unsigned char>> segments;
  JpegTables found;
  const bool isWhole = VisitSegments(
      form.tables, [&](unsigned char marker, const unsigned char* bytes, std::size_t count) {
        if (marker == kHuffman) found.mode |= 2;
        if (marker != kQuantization) return;
        found.mode |= 1;
        segments.emplace_back(bytes, bytes + count);
      });
  if (!isWhole || segments.size() != (form.isYcc ? 2 : 1)) return std::nullopt;
  constexpr unsigned kUsual = 75;
  for (unsigned i = 0; i <= 100 && found.quality == 0; ++i) {
    const unsigned quality = i == 0 ? kUsual : i;
    unsigned short tables[2][kTableSize];
    if (!MakeTables(quality, tables)) return std::nullopt;
    bool isSame = true;
    for (unsigned table = 0; table < segments.size(); ++table) {
      isSame = isSame && segments[table] == SegmentOf(tables[table], table);
    }
    if (isSame) found.quality = quality;
  }
  return found.quality != 0 ? std::optional(found) : std::nullopt;
}

}  // namespace lumo::tiff

#pragma once

#include "output/output_file.h"
#include "pictures/block_reader.h"

namespace lumo::host {

/// The first bytes of a .npy file: magic, version, and the dictionary, filled with blanks so that
/// the elements begin at a multiple of 64.
std::string MakeNpyHeader(unsigned dataType, const SubRect& rect, unsigned bands,
                          Interleave interleave);

/// Bands of an array that stand side by side.
struct BandSpan {
  unsigned first;
  unsigned count;
};

/// Writes an array into a .npy file, format version 1.0, in C order, block by block in any order;
/// or its elements alone into a raw one. The axes are those of the interleave: BIP (lines, samples,
/// bands), BIL (lines, bands, samples), BSQ (bands, lines, samples).
///
/// The format: https://numpy.org/doc/stable/reference/generated/numpy.lib.format.html
class NpyWriter {
 public:
  /// @param dataType  code of the elements. @param isRaw  without the header.
  NpyWriter(const OutputFile& output, unsigned dataType, const SubRect& rect, unsigned bands,
            Interleave interleave, bool isRaw);

  /// @param rect    pixels of the raster, inside the rectangle of the array.
  /// @param bands   all of them, unless the interleave is BSQ.
  /// @param pixels  in the array's interleave.
  void Write(const SubRect& rect, const BandSpan& bands, const unsigned char* pixels);
  void Close() { file_.Close(); }

  /// How long the file will be.
  static std::uint64_t GetBytes(unsigned dataType, const SubRect& rect, unsigned bands);

 private:
  void WriteRun(std::uint64_t element, const unsigned char*& pixels, std::uint64_t count);

  FileWriter file_;
  const unsigned elementBytes_;
  const SubRect rect_;
  const unsigned bands_;
  const Interleave interleave_;
  std::uint64_t start_ = 0;  // of the elements in the file
};

}  // namespace lumo::host

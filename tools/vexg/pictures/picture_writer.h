#pragma once

#include <memory>
#include <string>

#include "output/output_file.h"

namespace lumo::host {

/// Writes a picture into a file, line by line.
class PictureWriter {
 public:
  virtual ~PictureWriter() = default;
  /// Writes the next line: the channels of a pixel next to one another.
  virtual void WriteLine(const unsigned char* line) = 0;
  /// Ends the file, after the last line.
  virtual void Close() = 0;
};

/// True where the name's ending stands for a format of pictures: .png, .jpg, .jpeg or .webp.
bool IsPictureName(const std::string& name);

/// Throws HostError unless IsPictureName.
void CheckPictureName(const std::string& name);

/// Makes the writer for the format that the ending of the output's name stands for.
///
/// A JPEG has no alpha: pixels that are not opaque become white there, and the user hears of it.
/// @param channels  1 grey, 2 grey and alpha, 3 colours, 4 colours and alpha.
/// Throws HostError for a name that stands for no format, or a picture that it can't hold.
std::unique_ptr<PictureWriter> MakePictureWriter(const OutputFile& output, unsigned width,
                                                 unsigned height, unsigned channels);

}  // namespace lumo::host

#include "pictures/quicklook_maker.h"

#include <algorithm>

#include "pictures/picture_writer.h"
#include "pictures/text_image.h"
#include "verb.h"

namespace lumo::host {
namespace {

void ReadPixels(JobSession& session, const ShownRaster& raster, const Array<unsigned>& bands,
                ProgressStyle progress, QuicklookPicture& picture) {
  BlockReader reader(session, raster.uri, raster.info, raster.file);
  reader.ReadAll(picture.GetBlocks(), bands, Interleave::BIP, progress, [&](const SubRect& block) {
    picture.Take(block, reader.GetPixels(), reader.GetStates());
  });
  picture.Finish();
}

/// A picture with a list of colours on its right.
class LegendSheet {
 public:
  LegendSheet(const QuicklookPicture& picture, const QuicklookPicture::Bytes& bytes,
              const std::vector<LegendRow>& legend)
      : channels_(bytes.channels < 3 ? bytes.channels + 2 : bytes.channels) {
    std::vector<TextImage> texts;
    unsigned widest = 0;
    for (const LegendRow& row : legend) {
      texts.push_back(DrawText(row.name));
      widest = std::max(widest, texts.back().width);
    }
    const unsigned left = picture.GetWidth() + kMargin;
    width_ = left + kBox + kMargin + widest + kMargin;
    const auto rows = static_cast<unsigned>(legend.size());
    height_ = std::max(picture.GetHeight(), rows * kRow + 2 * kMargin);
    pixels_.assign(std::size_t{width_} * height_ * channels_, 255);
    Copy(picture, bytes);
    for (unsigned i = 0; i < rows; ++i) {
      const unsigned top = kMargin + i * kRow;
      FillBox(left, top, legend[i].color);
      texts[i].DrawOn(pixels_, width_, channels_, left + kBox + kMargin,
                      top + (kBox - std::min(kBox, texts[i].height)) / 2);
    }
  }

  unsigned Width() const { return width_; }
  unsigned Height() const { return height_; }
  unsigned Channels() const { return channels_; }
  const std::vector<unsigned char>& Pixels() const { return pixels_; }

 private:
  static constexpr unsigned kMargin = 8, kBox = 14, kRow = 20;  // pixels

  unsigned char* At(unsigned x, unsigned y) {
    return &pixels_[(std::size_t{y} * width_ + x) * channels_];
  }
  void Copy(const QuicklookPicture& picture, const QuicklookPicture::Bytes& bytes) {
    const unsigned char* from = bytes.pixels.data();
    const bool isGrey = bytes.channels < 3;
    for (unsigned y = 0; y < picture.GetHeight(); ++y) {
      for (unsigned x = 0; x < picture.GetWidth(); ++x, from += bytes.channels) {
        unsigned char* const to = At(x, y);
        if (isGrey) std::fill_n(to, 3, *from);
        std::copy_n(from + (isGrey ? 1 : 0), bytes.channels - (isGrey ? 1 : 0),
                    to + (isGrey ? 3 : 0));
      }
    }
  }
  void FillBox(unsigned left, unsigned top, const Color& color) {
    for (unsigned y = top; y < std::min(top + kBox, height_); ++y) {
      for (unsigned x = left; x < left + kBox; ++x) {
        unsigned char* const to = At(x, y);
        to[0] = color.r;
        to[1] = color.g;
        to[2] = color.b;
      }
    }
  }

  unsigned channels_, width_ = 0, height_ = 0;
  std::vector<unsigned char> pixels_;
};

void WritePicture(JobSession& session, const OutputFile& output, unsigned width, unsigned height,
                  const QuicklookPicture::Bytes& bytes) {
  const auto writer = MakePictureWriter(output, width, height, bytes.channels);
  const std::size_t lineBytes = std::size_t{width} * bytes.channels;
  for (std::size_t y = 0; y < height; ++y) {
    session.CheckInterrupt();
    writer->WriteLine(&bytes.pixels[y * lineBytes]);
  }
  writer->Close();
}

}  // namespace

Array<unsigned> ChoosePictureBands(const std::string& text, const RasterInfo& info) {
  std::string chosen = text;
  if (chosen.empty()) chosen = info.bands > 3 ? "2,1,0" : info.bands == 3 ? "0,1,2" : "0";
  const Array<unsigned> bands = ParseBands(chosen, info);
  if (bands.GetCount() == 1 || bands.GetCount() == 3) return bands;
  throw HostError(kExitUsage, "--bands: a picture shows one band or three");
}

PictureSampling ChooseSampling(const RasterInfo& info, const Array<unsigned>& bands) {
  return HoldsCodes(info, bands) ? PictureSampling::kNearest : PictureSampling::kAverage;
}

void MakeQuicklook(JobSession& session, const QuicklookRequest& request, const OutputFile& output,
                   ProgressStyle progress) {
  QuicklookPicture picture(request.raster.info, request.size, request.bands, request.sampling);
  ReadPixels(session, request.raster, request.bands, progress, picture);
  QuicklookPicture::Bytes bytes =
      request.palette ? picture.Draw(*request.palette) : picture.Draw(request.stretch);
  for (const Outlines& outlines : request.outlines) {
    Array<unsigned> first{ArrayDims(1)};
    first[0] = 0;
    QuicklookPicture labels(outlines.labels.info, request.size, first, PictureSampling::kNearest);
    ReadPixels(session, outlines.labels, first, progress, labels);
    labels.DrawOutlines(outlines.colour, bytes);
  }
  if (request.legend.empty()) {
    return WritePicture(session, output, picture.GetWidth(), picture.GetHeight(), bytes);
  }
  const LegendSheet sheet(picture, bytes, request.legend);
  WritePicture(session, output, sheet.Width(), sheet.Height(), {sheet.Channels(), sheet.Pixels()});
}

}  // namespace lumo::host

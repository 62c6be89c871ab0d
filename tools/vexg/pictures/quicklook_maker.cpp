#include "pictures/quicklook_maker.h"

#include "pictures/picture_writer.h"
#include "verb.h"

namespace lumo::host {
namespace {

void ReadPixels(JobSession& session, const ShownRaster& raster, const Array<unsigned>& bands,
                ProgressStyle progress, QuicklookPicture& picture) {
  BlockReader reader(session, raster.uri, raster.info, raster.file);
  reader.ReadAll(picture.GetBlocks(), bands, Interleave::BIP, progress, [&](const SubRect& block) {
    picture.Take(block, reader.GetPixels(), reader.GetStates());
  });
}

}  // namespace

Array<unsigned> ChoosePictureBands(const std::string& text, const RasterInfo& info) {
  std::string chosen = text;
  if (chosen.empty()) chosen = info.bands > 3 ? "2,1,0" : info.bands == 3 ? "0,1,2" : "0";
  const Array<unsigned> bands = ParseBands(chosen, info);
  if (bands.GetCount() == 1 || bands.GetCount() == 3) return bands;
  throw HostError(kExitUsage, "--bands: a picture shows one band or three");
}

void MakeQuicklook(JobSession& session, const QuicklookRequest& request, const OutputFile& output,
                   ProgressStyle progress) {
  QuicklookPicture picture(request.raster.info, request.size, request.bands);
  ReadPixels(session, request.raster, request.bands, progress, picture);
  QuicklookPicture::Bytes bytes =
      request.palette ? picture.Draw(*request.palette) : picture.Draw(request.stretch);
  for (const Outlines& outlines : request.outlines) {
    Array<unsigned> first{ArrayDims(1)};
    first[0] = 0;
    QuicklookPicture labels(outlines.labels.info, request.size, first);
    ReadPixels(session, outlines.labels, first, progress, labels);
    labels.DrawOutlines(outlines.colour, bytes);
  }
  const auto writer =
      MakePictureWriter(output, picture.GetWidth(), picture.GetHeight(), bytes.channels);
  const std::size_t lineBytes = std::size_t{picture.GetWidth()} * bytes.channels;
  for (std::size_t y = 0; y < picture.GetHeight(); ++y) {
    session.CheckInterrupt();
    writer->WriteLine(&bytes.pixels[y * lineBytes]);
  }
  writer->Close();
}

}  // namespace lumo::host

#pragma once

#include <atomic>

#include "pyramid_file.h"

namespace lumo::pyramid {

/// A pyramid file in the making. It lies beside its place under a temporary name, and takes the
/// place once every tile of every level is written: until then the file that stands there stays as
/// it is. One that is let go before takes its temporary file away.
///
/// Connections of this process that belong to one path meet at one build: that which has begun it,
/// and that which writes the pixels.
/// Threads: any.
/// Failure: false or null, with SetFault.
class Build {
 public:
  /// Begins a build, in place of an older one that is not being written to.
  /// @param path    absolute, with links resolved.
  /// @param header  the raster and the levels wanted.
  static std::shared_ptr<Build> Begin(const std::string& path, const Header& header);
  /// The build of a path that is under way; null when there is none.
  static std::shared_ptr<Build> Find(const std::string& path);

  ~Build();
  Build(const Build&) = delete;
  Build& operator=(const Build&) = delete;

  const Header& GetHeader() const { return header_; }

  /// A row of tiles, one after the other from left to right, each a block of its own.
  struct TileRow {
    TilePlace first;
    unsigned columns;
    const unsigned char* pixels;
    const unsigned char* states;
  };
  /// Packs and writes tiles. Of states, those stay that tell more than that there is no data.
  bool Write(const TileRow& tiles);

  /// True when every tile is written.
  bool IsWhole() const;
  /// Gives the file its place, when it is whole; true as well when it has that already.
  /// @param values  text of the values of bands.
  bool Commit(const std::string& values);
  bool IsCommitted() const { return isCommitted_; }

 private:
  struct Packed;

  Build(const std::string& path, const Header& header) : path_(path), header_(header) {}
  bool Open();
  bool Fail(const std::string& fault) const;
  void Pack(const TileRow& tiles, unsigned index, Packed& packed) const;
  std::uint64_t TileValues(const TilePlace& place) const;

  const std::string path_;
  Header header_;
  std::mutex lock_;  // of what follows
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::array<std::vector<TileEntry>, kLevelCount> indices_;
  std::uint64_t end_ = kDataBegin;
  std::atomic<std::uint64_t> missing_{0};  // tiles
  std::atomic<bool> isCommitted_{false};
};

}  // namespace lumo::pyramid

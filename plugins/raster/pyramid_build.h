#pragma once

#include <atomic>
#include <map>
#include <optional>
#include <set>

#include "data/packed_levels.h"
#include "platform/file_identity.h"
#include "platform/memory_shortage.h"
#include "pyramid/packed_tiles.h"
#include "pyramid_file.h"

namespace lumo::pyramid {

/// A pyramid file in the making. It lies beside its place under a temporary name, and is whole once
/// every tile of every level is written and Complete was called. Tiles that come before their turn,
/// see TileOrder, are held in memory until that. Then the file can be read and given
/// values there, until it takes its place: up to that moment the file that stands there stays as it
/// is. One that is let go before takes its temporary file away.
///
/// Connections of this process that belong to one path meet at one build: that which has begun it,
/// and that which writes the pixels. Of the builds of several processes the first one to be whole
/// takes the place.
/// Threads: any.
/// Failure: false or null, with SetFault.
class Build {
 public:
  /// Begins a build, in place of an older one that is not being written to.
  /// @param path    absolute, with links resolved.
  /// @param header  the raster and the levels wanted.
  /// @param beginner  identifies it, until it has left.
  static std::shared_ptr<Build> Begin(const std::string& path, const Header& header,
                                      const void* beginner);
  /// The build of a path that is under way; null when there is none.
  static std::shared_ptr<Build> Find(const std::string& path);

  ~Build();
  Build(const Build&) = delete;
  Build& operator=(const Build&) = delete;

  const Header& GetHeader() const { return header_; }

  /// Packs and writes tiles.
  /// @param band    of a raster that is stored band by band; else 0.
  /// @param writer  identifies the writer, until it has left.
  bool Write(unsigned band, const PlainTiles& tiles, const void* writer);
  /// Writes tiles that are packed as the file is.
  bool Write(const PackedTileRow& row, const void* writer);
  void Leave(const void* self);
  /// True for the one that may give the file its place: that which has begun it, or after that has
  /// left anyone, once nobody else writes.
  bool MayTakePlace(const void* self) const;
  /// True when somebody else has written.
  bool IsOfAnother(const void* self) const;

  /// True when every tile is written.
  bool IsWhole() const;
  /// Makes a file of what is written, when that is whole; true as well when it is one already.
  /// @param values  text of the values of bands.
  bool Complete(const std::string& values);
  bool IsComplete() const { return isComplete_; }
  /// Where the file lies until it takes its place.
  const std::string& TemporaryPath() const { return temporary_; }

  /// Notes that values were stored in the file, or could not be.
  void NoteValues(bool areStored) { values_ = areStored ? values_ + 1 : kLost; }
  /// True when statistics and histograms were stored in the file, and none failed to be.
  bool HasValues() const { return values_ >= kStores; }

  /// Gives a complete file its place, unless another was put there since the build began.
  bool TakePlace();
  /// Nothing happens to it any more.
  bool IsOver() const { return isOver_; }
  /// True when it has ended without its place; sets the fault.
  bool HasFailed() const;
  /// Ends the build. @param fault  why, for those who ask it later; empty for no fault.
  void GiveUp(const std::string& fault = {});

 private:
  /// Stored tiles side by side, and where their bytes lie.
  struct Run {
    TilePlace first;
    std::vector<StoredTile> tiles;
    std::vector<platform::ConstFilePiece> pieces;
    std::uint64_t bytes = 0;
  };

  static constexpr int kStores = 2;  // of a build: histograms, then statistics
  static constexpr int kLost = -1000;

  Build(const std::string& path, const Header& header);
  bool Open();
  bool Fail(const std::string& fault) const;
  bool FailBy(const std::string& fault);
  bool FindMisfit(const PackedTileRow& row) const;
  bool Take(const Run& run, const void* writer);
  bool Append(const Run& run);
  bool AppendHeld(const TilePlace& first);
  void Hold(const Run& run);
  TileEntry& EntryOf(const TilePlace& first, unsigned index);
  std::uint64_t MostHeldBytes() const;

  const std::string path_;
  const std::string temporary_;
  const platform::FileIdentity older_;  // that stands at the place
  const platform::MemoryWatch memory_;
  Header header_;
  mutable std::mutex lock_;  // of what follows
  const void* beginner_ = nullptr;
  std::set<const void*> writers_;
  std::set<const void*> pastWriters_;
  std::string fault_;
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::array<std::vector<TileEntry>, kLevelCount> indices_;
  std::uint64_t end_ = kDataBegin;
  std::optional<TileOrder> order_;
  std::map<TilePlace, PackedTileRow> held_;  // by the first tile of each, before their turn
  std::uint64_t heldBytes_ = 0;
  std::atomic<std::uint64_t> missing_{0};  // tiles
  std::atomic<bool> isComplete_{false};
  std::atomic<bool> isOver_{false};
  std::atomic<bool> hasPlace_{false};
  std::atomic<int> values_{0};  // how often they were stored
};

}  // namespace lumo::pyramid

#pragma once

#include <optional>
#include <string>
#include <vector>

#include "foundation/buffer.h"

namespace lumo {

/// The entries that a table has room for, whatever the pixel type. A histogram has no more bins.
inline constexpr unsigned kMosaicTableBins = 65536;

/// Describes one table: the range of the scene's histogram, and how many entries are in use.
struct MosaicLUTItemBase {
  double minimum = 0;          ///< lowest value of the scene's histogram
  double maximum = 0;          ///< highest value
  std::uint32_t bins = 0;      ///< entries in use; 0: the scene takes no part
  std::uint32_t reserved = 0;  ///< 0
};
static_assert(sizeof(MosaicLUTItemBase) == 24);

/// Stores what is known of the tables of a mosaic, one for each scene and band. Item is
/// MosaicLUTItemBase. Threads: one at a time.
template <typename Item>
class MosaicHistMatchingLUTBase : public Object {
 public:
  virtual unsigned Scenes() const = 0;
  virtual void SetScenes(unsigned scenes) = 0;
  virtual unsigned Bands() const = 0;
  virtual void SetBands(unsigned bands) = 0;
  /// True for every store.
  virtual bool IsUsable() const { return true; }
  /// An item to read; good until the next call.
  virtual const Item& At(unsigned scene, unsigned band) = 0;
  /// An item to write; good until the next call.
  virtual Item& Ref(unsigned scene, unsigned band) = 0;
  /// Does nothing.
  virtual void Update() {}
};

/// Stores the entries of the tables of a mosaic by scene, band and bin. Entry is double. Threads:
/// one at a time.
template <typename Entry>
class MosaicHistMatchingLUT : public Object {
 public:
  virtual unsigned Scenes() const = 0;
  virtual void SetScenes(unsigned scenes) = 0;
  virtual unsigned Bands() const = 0;
  virtual void SetBands(unsigned bands) = 0;
  virtual unsigned Bins() const = 0;
  virtual void SetBins(unsigned bins) = 0;
  /// True for every store.
  virtual bool IsUsable() const { return true; }
  /// An entry to read; good until the next call.
  virtual const Entry& At(unsigned scene, unsigned band, unsigned bin) = 0;
  /// An entry to write; good until the next call.
  virtual Entry& Ref(unsigned scene, unsigned band, unsigned bin) = 0;
  /// Does nothing.
  virtual void Update() {}
};

namespace detail {

/// A file of elements behind a header with a mark and counts of 32 bits; see
/// docs/file-formats.md.
template <typename E>
class LUTFile {
 public:
  /// Creates a file, or empties the one that is there.
  LUTFile(const String& path, unsigned scenes, unsigned bands, std::vector<unsigned> more,
          std::string_view mark);
  /// Opens a file to read it.
  LUTFile(const String& path, unsigned moreCounts, std::string_view mark);

  bool IsValid() const { return isKnown_ && buffer_.IsValid(); }
  Buffer<E>& Elements() { return buffer_; }
  std::vector<unsigned>& Counts() { return counts_; }
  const std::vector<unsigned>& Counts() const { return counts_; }
  bool Close();

 private:
  std::string_view mark_;
  std::vector<unsigned> counts_;  // scenes, bands, more
  Buffer<E> buffer_;
  bool isKnown_ = false;
  bool isNew_ = false;
};

extern template class VEXG_EXPORT LUTFile<MosaicLUTItemBase>;
extern template class VEXG_EXPORT LUTFile<double>;

}  // namespace detail

/// The `.mlh` file. It has no valid header until it is closed.
///
/// Failure: ObjectErrorIO and the like of Buffer; TakeFault says why. A file without the mark isn't
///          valid.
template <typename Item>
class MosaicHistMatchingLUTBaseFile;

template <>
class VEXG_EXPORT MosaicHistMatchingLUTBaseFile<MosaicLUTItemBase> final
    : public MosaicHistMatchingLUTBase<MosaicLUTItemBase> {
 public:
  /// Creates a file of items that are 0.
  MosaicHistMatchingLUTBaseFile(const String& path, unsigned scenes, unsigned bands);
  /// Opens a file to read it.
  explicit MosaicHistMatchingLUTBaseFile(const String& path);

  bool IsValid() const override { return file_.IsValid(); }
  unsigned Scenes() const override { return file_.Counts()[0]; }
  void SetScenes(unsigned scenes) override { file_.Counts()[0] = scenes; }
  unsigned Bands() const override { return file_.Counts()[1]; }
  void SetBands(unsigned bands) override { file_.Counts()[1] = bands; }
  const MosaicLUTItemBase& At(unsigned scene, unsigned band) override;
  MosaicLUTItemBase& Ref(unsigned scene, unsigned band) override;

  /// Completes the file and closes it. @return false when it isn't whole on the disk.
  bool Close() { return file_.Close(); }

 private:
  detail::LUTFile<MosaicLUTItemBase> file_;
};

/// The `.mlt` file, like MosaicHistMatchingLUTBaseFile. What was never written is 0, and takes no
/// room on the disk.
template <typename Entry>
class MosaicHistMatchingLUTFile;

template <>
class VEXG_EXPORT MosaicHistMatchingLUTFile<double> final : public MosaicHistMatchingLUT<double> {
 public:
  /// Creates a file of entries that are 0.
  MosaicHistMatchingLUTFile(const String& path, unsigned scenes, unsigned bands);
  /// Opens a file to read it.
  explicit MosaicHistMatchingLUTFile(const String& path);

  bool IsValid() const override { return file_.IsValid(); }
  unsigned Scenes() const override { return file_.Counts()[0]; }
  void SetScenes(unsigned scenes) override { file_.Counts()[0] = scenes; }
  unsigned Bands() const override { return file_.Counts()[1]; }
  void SetBands(unsigned bands) override { file_.Counts()[1] = bands; }
  unsigned Bins() const override { return file_.Counts()[2]; }
  void SetBins(unsigned bins) override { file_.Counts()[2] = bins; }
  const double& At(unsigned scene, unsigned band, unsigned bin) override;
  double& Ref(unsigned scene, unsigned band, unsigned bin) override;

  /// Completes the file and closes it. @return false when it isn't whole on the disk.
  bool Close() { return file_.Close(); }

 private:
  std::uint64_t PlaceOf(unsigned scene, unsigned band, unsigned bin) const;

  detail::LUTFile<double> file_;
};

/// The table of one scene and band: entry i stands for the values of bin i of the scene's
/// histogram.
struct MosaicTable {
  double minimum = 0;           ///< where the first bin begins
  double maximum = 0;           ///< the highest value
  std::vector<double> entries;  ///< none: the scene's values stay
};

/// Reads the two files of tables of a mosaic. Threads: one at a time.
///
///     MosaicTableReader tables(definition->LutPath());
///     MosaicTable table;
///     if (!tables.IsValid() || !tables.Read(scene, band, table)) return false;
class VEXG_EXPORT MosaicTableReader : public Object {
 public:
  /// @param base  of the names of both files. IsValid() is false unless both are whole and tell of
  ///              as many scenes and bands; TakeFault says why.
  explicit MosaicTableReader(const String& base);

  unsigned Scenes() const { return items_.Scenes(); }
  unsigned Bands() const { return items_.Bands(); }
  /// False when the table can't be read, or there is none for the scene and band.
  bool Read(unsigned scene, unsigned band, MosaicTable& table);

 private:
  MosaicHistMatchingLUTBaseFile<MosaicLUTItemBase> items_;
  MosaicHistMatchingLUTFile<double> entries_;
};

}  // namespace lumo

#pragma once

#include "fx/region_attributes.h"

namespace lumo {

// The attributes of a band, for each kind of store. Each kind is a tag that its stores derive from.
// The last attribute of each marks that the region is there.

/// The mean of the pixels of a region.
struct RegionMeans {
  enum : unsigned {
    kMean,  ///< the sum, until all pixels were seen
    kPixelCount,
    kAttributes
  };
  static constexpr unsigned kBands = 0;  ///< as many as the image has
  static constexpr const char* kName = "RegionMeans";
};

/// The distribution of the pixels of a region.
struct SpectralRegionAttributes {
  enum : unsigned {
    kMean,    ///< the sum, until all pixels were seen
    kStdDev,  ///< the sum of squares, until then
    kMin,
    kMax,
    kPixelCount,
    kAttributes
  };
  static constexpr unsigned kBands = 0;
  static constexpr const char* kName = "SpectralRegionAttributes";
};

/// Means over a region of the texture in windows round its pixels.
struct TextureRegionAttributes {
  enum : unsigned { kRange, kMean, kVariance, kEntropy, kPixelCount, kAttributes };
  static constexpr unsigned kBands = 0;
  static constexpr const char* kName = "TextureRegionAttributes";
};

/// The shape of a region; lengths in map units, angles in degrees.
struct SpatialRegionAttributes {
  enum : unsigned {
    kArea,       ///< square map units
    kPerimeter,  ///< map units
    kCompactness,
    kConvexity,
    kSolidity,
    kRoundness,
    kFormFactor,
    kElongation,
    kRectangularFit,
    kMainDirection,  ///< degrees
    kMajorLength,    ///< map units
    kMinorLength,    ///< map units
    kHoleCount,
    kHoleToSolidRatio,
    kPresence,  ///< 1
    kAttributes
  };
  static constexpr unsigned kBands = 1;
  static constexpr const char* kName = "SpatialRegionAttributes";
};

/// A map with the attributes of a kind.
template <typename Kind>
class RegionMapOf final : public RegionAttributesMap<float>, public Kind {
 public:
  static const unsigned TypeCode;

  /// A map for the bands of an image.
  explicit RegionMapOf(unsigned bands) requires(Kind::kBands == 0)
      : RegionAttributesMap(bands, Kind::kAttributes) {}
  /// A map for the kind's own number of bands.
  RegionMapOf() requires(Kind::kBands != 0)
      : RegionAttributesMap(Kind::kBands, Kind::kAttributes) {}

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || RegionAttributesMap::IsA(typeCode);
  }
};

/// A file with the attributes of a kind. One that is opened and has other attributes, or bands
/// where the kind knows how many, is not valid.
template <typename Kind>
class RegionFileOf final : public RegionAttributesFile<float>, public Kind {
 public:
  static const unsigned TypeCode;

  /// Opens a file.
  RegionFileOf(const URI& uri, bool writable) : RegionAttributesFile(uri, writable) {
    Require(Kind::kBands != 0 ? Kind::kBands : Bands(), Kind::kAttributes);
  }
  /// Creates a file.
  RegionFileOf(const URI& uri, unsigned bands) requires(Kind::kBands == 0)
      : RegionAttributesFile(uri, bands, Kind::kAttributes) {}
  /// Creates a file for the kind's own number of bands.
  explicit RegionFileOf(const URI& uri) requires(Kind::kBands != 0)
      : RegionAttributesFile(uri, Kind::kBands, Kind::kAttributes) {}

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || RegionAttributesFile::IsA(typeCode);
  }
};

extern template class VEXG_EXPORT RegionMapOf<RegionMeans>;
extern template class VEXG_EXPORT RegionFileOf<RegionMeans>;
extern template class VEXG_EXPORT RegionMapOf<SpectralRegionAttributes>;
extern template class VEXG_EXPORT RegionFileOf<SpectralRegionAttributes>;
extern template class VEXG_EXPORT RegionMapOf<TextureRegionAttributes>;
extern template class VEXG_EXPORT RegionFileOf<TextureRegionAttributes>;
extern template class VEXG_EXPORT RegionMapOf<SpatialRegionAttributes>;
extern template class VEXG_EXPORT RegionFileOf<SpatialRegionAttributes>;

using RegionMeansMap = RegionMapOf<RegionMeans>;
using RegionMeansFile = RegionFileOf<RegionMeans>;
using SpectralRegionAttributesMap = RegionMapOf<SpectralRegionAttributes>;
using SpectralRegionAttributesFile = RegionFileOf<SpectralRegionAttributes>;
using TextureRegionAttributesMap = RegionMapOf<TextureRegionAttributes>;
using TextureRegionAttributesFile = RegionFileOf<TextureRegionAttributes>;
using SpatialRegionAttributesMap = RegionMapOf<SpatialRegionAttributes>;
using SpatialRegionAttributesFile = RegionFileOf<SpatialRegionAttributes>;

/// A score of each region for each class. Every region is there.
class VEXG_EXPORT RegionClassificationProbabilityMap final : public RegionAttributesMap<float> {
 public:
  static const unsigned TypeCode;

  explicit RegionClassificationProbabilityMap(unsigned classes) : RegionAttributesMap(1, classes) {}

  bool IsA(unsigned typeCode) const override;
  bool RegionExists(unsigned, unsigned) const override { return true; }
};

/// The same in a file.
class VEXG_EXPORT RegionClassificationProbabilityFile final : public RegionAttributesFile<float> {
 public:
  static const unsigned TypeCode;

  /// Opens a file. One with more than one band is not valid.
  RegionClassificationProbabilityFile(const URI& uri, bool writable)
      : RegionAttributesFile(uri, writable) {
    Require(1, Attributes());
  }
  /// Creates a file.
  RegionClassificationProbabilityFile(const URI& uri, unsigned classes)
      : RegionAttributesFile(uri, 1, classes) {}

  bool IsA(unsigned typeCode) const override;
  bool RegionExists(unsigned, unsigned) const override { return true; }
};

}  // namespace lumo

#include "fx/chosen_attributes.h"

#include <algorithm>
#include <filesystem>
#include <system_error>

#include "data/access_policy.h"
#include "foundation/fault.h"

namespace lumo {
namespace {

/// Opens a store for each name. @param open  makes one.
template <typename Store, typename Open>
bool OpenAll(const Array<String>& names, const char* input, const char* kind,
             std::vector<std::unique_ptr<Store>>& stores, const Open& open) {
  stores.clear();
  for (const String& name : names) {
    const std::string path = name.ToUTF8();
    if (!MayReachFile(path, false)) return false;
    std::error_code none;
    if (!std::filesystem::is_regular_file(path, none)) {
      return Refuse(std::string(input) + ": there is no file " + path);
    }
    stores.push_back(open(URI(String(path))));
    if (!stores.back()->IsValid()) {
      return Refuse(std::string(input) + ": " + path + " is no file of " + kind);
    }
  }
  return !stores.empty() || Refuse(std::string(input) + ": there is no file");
}

}  // namespace

bool ChosenAttributes::Open(const Array<String>& names) {
  return OpenAll(names, "AttributesFXA", "regions", files_, [](const URI& uri) {
    return std::make_unique<RegionAttributesFile<float>>(uri, false);
  });
}

bool ChosenAttributes::OpenStatistics(const Array<String>& names) {
  if (names.GetCount() != files_.size()) {
    return Refuse("StatsFXAS: there are " + std::to_string(names.GetCount()) +
                  " files, and in AttributesFXA " + std::to_string(files_.size()));
  }
  if (!OpenAll(names, "StatsFXAS", "statistics", statistics_, [](const URI& uri) {
        return std::make_unique<RegionAttributeStatsFile<float>>(uri);
      })) {
    return false;
  }
  for (std::size_t i = 0; i < files_.size(); ++i) {
    if (statistics_[i]->Bands() != files_[i]->Bands() ||
        statistics_[i]->Attributes() != files_[i]->Attributes()) {
      return Refuse("StatsFXAS: file " + std::to_string(i) +
                    " is of other bands or attributes than that of AttributesFXA");
    }
  }
  return true;
}

bool ChosenAttributes::Choose(std::vector<AttributeChoice> choices, const char* input) {
  for (std::size_t row = 0; row < choices.size(); ++row) {
    const AttributeChoice& choice = choices[row];
    const auto check = [&](unsigned value, unsigned end, const char* what) {
      return value < end ||
             Refuse(std::string(input) + ": row " + std::to_string(row) + ": there is no " + what +
                    " " + std::to_string(value) + ", only " + std::to_string(end));
    };
    if (!check(choice.file, FileCount(), "file")) return false;
    const RegionAttributesFile<float>& file = *files_[choice.file];
    if (!check(choice.attribute, file.Attributes(), "attribute") ||
        !check(choice.band, file.Bands(), "band")) {
      return false;
    }
  }
  choices_ = std::move(choices);
  scales_.clear();
  if (statistics_.empty()) return true;
  for (const AttributeChoice& choice : choices_) {
    const RegionAttributeStatsFile<float>& of = *statistics_[choice.file];
    scales_.push_back({static_cast<double>(of.Mean(choice.band, choice.attribute)),
                       static_cast<double>(of.StdDev(choice.band, choice.attribute))});
  }
  return true;
}

unsigned ChosenAttributes::RegionCount() const {
  unsigned least = files_.empty() ? 0 : files_.front()->RegionCount();
  for (const auto& file : files_) least = std::min(least, file->RegionCount());
  return least;
}

void ChosenAttributes::Read(const unsigned* regions, unsigned count, double* values) const {
  // Record by record: that is how they lie in the files.
  for (unsigned j = 0; j < count; ++j) {
    for (std::size_t i = 0; i < choices_.size(); ++i) {
      const AttributeChoice& choice = choices_[i];
      const RegionAttributesFile<float>& file = *files_[choice.file];
      values[i * count + j] =
          static_cast<double>(file.Value(regions[j], choice.band, choice.attribute));
    }
  }
}

bool ChosenAttributes::IsAbsent(unsigned region) const {
  const RegionAttributesFile<float>& file = *files_[choices_.front().file];
  return file.Value(region, 0, file.Attributes() - 1) == 0;
}

void ChosenAttributes::Standardize(unsigned count, double* values) const {
  for (const Scale& scale : scales_) {
    for (unsigned j = 0; j < count; ++j, ++values) {
      *values = scale.deviation != 0 ? (*values - scale.mean) / scale.deviation : 0.0;
    }
  }
}

}  // namespace lumo

#include "tiff/tiff_stats.h"

#include <algorithm>
#include <charconv>
#include <cmath>

#include "commands/plain_xml.h"
#include "commands/value_text.h"

namespace lumo::tiff {
namespace {

/// A detail of a band that GDAL writes as an item, and our name of it.
struct DetailItem {
  const char *item, *role, *detail;
};
constexpr DetailItem kDetails[] = {{"DESCRIPTION", "description", "Description"},
                                   {"UNITTYPE", "unittype", "Unit"},
                                   {"COLORINTERP", "colorinterp", "Meaning"},
                                   {"SCALE", "scale", "Scale"},
                                   {"OFFSET", "offset", "Offset"}};

/// Puts a text of the tag into the form that a detail has. False for one that is GDAL's to read.
bool TakeDetail(const std::string& detail, std::string& text) {
  if (text.find('&') != text.npos) return false;  // GDAL takes marks apart once more
  if (detail == "Meaning") {
    static constexpr const char* kColors[] = {"Red", "Green", "Blue"};
    if (text == "Gray" || text == "Undefined") text.clear();
    return text.empty() ||
           std::find(std::begin(kColors), std::end(kColors), text) != std::end(kColors);
  }
  if (detail != "Scale" && detail != "Offset") return true;
  double number = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, fault] = std::from_chars(text.data(), end, number);
  if (fault != std::errc() || stop != end || !std::isfinite(number)) return false;
  const bool changesNothing = number == (detail == "Scale" ? 1.0 : 0.0);
  text = changesNothing ? std::string() : FormatValue(number).ToUTF8();
  return true;
}

}  // namespace

/// Reads both forms:
///
///     <GDALMetadata><Item name="STATISTICS_…" sample="0">…</Item>
///     <Item name="DESCRIPTION" sample="0" role="description">…</Item>…</GDALMetadata>
///     <PAMDataset><PAMRasterBand band="1"><Metadata><MDI key="STATISTICS_…">…</MDI>…</Metadata>
///     <Histograms>…</Histograms></PAMRasterBand>…</PAMDataset>
class StoredItems::Parser final : public XMLSimpleParser {
 public:
  Parser(StoredItems& items, unsigned bands) : items_(items), bands_(bands) {}

  /// True when all was read, and is known here.
  bool IsUnderstood() const { return isKnown_ && isWhole_; }

  void EndDocument() override { isWhole_ = true; }
  void StartElement(const String& name, const Map<String, String>& attributes) override {
    path_.push_back(name.ToUTF8());
    text_.clear();
    const std::size_t depth = path_.size();
    if (depth > 3 && path_[2] == "Histograms") return;
    const bool isTag = path_[0] == "GDALMetadata";
    if (depth == 1) {
      Expect(isTag || path_[0] == "PAMDataset", attributes, 0);
    } else if (isTag) {
      TakeRole(attributes);
      Expect(depth == 2 && path_[1] == "Item", attributes, detail_ != nullptr ? 3 : 2);
      TakePlace(attributes, "name", "sample", 0);
    } else if (depth == 2) {
      Expect(path_[1] == "PAMRasterBand", attributes, 1);
      TakePlace(attributes, nullptr, "band", 1);
    } else if (depth == 3) {
      Expect(path_[2] == "Metadata" || path_[2] == "Histograms", attributes, 0);
      items_.hasHistograms_ = items_.hasHistograms_ || path_[2] == "Histograms";
    } else {
      Expect(depth == 4 && path_[3] == "MDI", attributes, 1);
      TakePlace(attributes, "key", nullptr, 0);
    }
  }
  void EndElement(const String&) override {
    const bool isItem = path_.back() == "Item" || path_.back() == "MDI";
    if (isKnown_ && isItem && path_[path_.size() - 2] != "Histograms") {
      // GDAL skips the blanks at the start of a text.
      const std::size_t start = text_.find_first_not_of(" \t\r\n");
      std::string text = start != text_.npos ? text_.substr(start) : std::string();
      if (detail_ == nullptr) {
        items_.items_[band_][name_] = std::move(text);
      } else {
        isKnown_ = TakeDetail(detail_->detail, text);
        items_.details_[band_][detail_->detail] = std::move(text);
      }
    }
    path_.pop_back();
    text_.clear();
  }
  void Characters(const String& text) override { text_ += text.ToUTF8(); }

 private:
  void Expect(bool isKnown, const Map<String, String>& attributes, std::size_t count) {
    isKnown_ = isKnown_ && isKnown && attributes.GetCount() == count;
  }

  /// Finds whether an item is a detail of a band.
  void TakeRole(const Map<String, String>& attributes) {
    const std::string name = TextOf(attributes, "name"), role = TextOf(attributes, "role");
    const auto* const at = std::find_if(
        std::begin(kDetails), std::end(kDetails),
        [&](const DetailItem& each) { return name == each.item && role == each.role; });
    detail_ = at != std::end(kDetails) ? at : nullptr;
  }

  /// Takes what item of which band an element holds, out of its attributes.
  void TakePlace(const Map<String, String>& attributes, const char* name, const char* band,
                 unsigned first) {
    if (name != nullptr) {
      name_ = TextOf(attributes, name);
      isKnown_ = isKnown_ && (detail_ != nullptr || name_.starts_with("STATISTICS_"));
    }
    if (band == nullptr) return;
    const std::string text = TextOf(attributes, band);
    unsigned number = 0;
    const auto [end, fault] = std::from_chars(text.data(), text.data() + text.size(), number);
    isKnown_ = isKnown_ && fault == std::errc() && end == text.data() + text.size() &&
               number >= first && number - first < bands_;
    band_ = number - first;
  }

  static std::string TextOf(const Map<String, String>& attributes, const char* name) {
    return attributes.Find(name).ToUTF8();
  }

  StoredItems& items_;
  const unsigned bands_;
  std::vector<std::string> path_;  // names of the open elements
  std::string text_, name_;
  const DetailItem* detail_ = nullptr;  // of the open item; null for statistics
  unsigned band_ = 0;
  bool isKnown_ = true, isWhole_ = false;
};

bool StoredItems::TakeTag(const std::string& text, unsigned bands) {
  Parser parser(*this, bands);
  return text.find("<GDALMetadata") != text.npos && ReadPlainXml(text, parser) &&
         parser.IsUnderstood();
}

bool StoredItems::TakeSideFile(const std::string& text, unsigned bands) {
  Parser parser(*this, bands);
  return text.find("<PAMDataset") != text.npos && ReadPlainXml(text, parser) &&
         parser.IsUnderstood();
}

const std::map<std::string, std::string>& StoredItems::Details(unsigned band) const {
  static const std::map<std::string, std::string> none;
  const auto details = details_.find(band);
  return details != details_.end() ? details->second : none;
}

std::optional<gdal::StoredStats> StoredItems::Stats(unsigned band) const {
  const auto items = items_.find(band);
  if (items == items_.end()) return std::nullopt;
  return gdal::StatsOfItems([&](const char* name) {
    const auto item = items->second.find(name);
    return item != items->second.end() ? item->second : std::string();
  });
}

}  // namespace lumo::tiff

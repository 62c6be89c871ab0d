#include "tiff/tiff_stats.h"

#include "commands/plain_xml.h"

namespace lumo::tiff {

/// Reads both forms:
///
///     <GDALMetadata><Item name="STATISTICS_…" sample="0">…</Item>…</GDALMetadata>
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
      Expect(depth == 2 && path_[1] == "Item", attributes, 2);
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
      items_.items_[band_][name_] = start != text_.npos ? text_.substr(start) : std::string();
    }
    path_.pop_back();
    text_.clear();
  }
  void Characters(const String& text) override { text_ += text.ToUTF8(); }

 private:
  void Expect(bool isKnown, const Map<String, String>& attributes, std::size_t count) {
    isKnown_ = isKnown_ && isKnown && attributes.GetCount() == count;
  }

  /// Takes what item of which band an element holds, out of its attributes.
  void TakePlace(const Map<String, String>& attributes, const char* name, const char* band,
                 unsigned first) {
    if (name != nullptr) {
      name_ = TextOf(attributes, name);
      isKnown_ = isKnown_ && name_.starts_with("STATISTICS_");
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

std::optional<gdal::StoredStats> StoredItems::Stats(unsigned band) const {
  const auto items = items_.find(band);
  if (items == items_.end()) return std::nullopt;
  return gdal::StatsOfItems([&](const char* name) {
    const auto item = items->second.find(name);
    return item != items->second.end() ? item->second : std::string();
  });
}

}  // namespace lumo::tiff

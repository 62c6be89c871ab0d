#include "fx/attribute_columns.h"

#include <algorithm>

#include "foundation/fault.h"
#include "fx/region_attributes.h"

namespace lumo {
namespace {

constexpr std::size_t kPieceBytes = 1 << 20;

}  // namespace

AttributeColumns::AttributeColumns(const URI& uri) {
  const std::string path = uri.ToUTF8();
  std::string why;
  auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &why);
  std::uint64_t bytes = 0;
  if (!file || !file->GetSize(bytes, &why)) {
    SetFault(String(why));
    return;
  }
  const RegionAttributesFile<float> store(uri, false);
  bands_ = store.Bands();
  attributes_ = store.Attributes();
  const std::uint64_t record = sizeof(float) * std::uint64_t{bands_} * attributes_;
  if (!store.IsValid() || record == 0 || (bytes - BasicBuffer::kHeaderSize) % record != 0) {
    SetFault(String(path + (store.IsValid() && record != 0 ? ": the file ends within a record"
                                                           : ": this is no file of regions")));
    return;
  }
  records_ = (bytes - BasicBuffer::kHeaderSize) / record;
  file_ = std::move(file);
}

bool AttributeColumns::Read(unsigned band, unsigned attribute, std::vector<float>& values) const {
  if (!IsValid() || band >= bands_ || attribute >= attributes_) {
    SetFault("there is no such column of regions");
    return false;
  }
  const std::size_t length = std::size_t{bands_} * attributes_;
  const std::size_t at = std::size_t{band} * attributes_ + attribute;
  const std::size_t most = std::max<std::size_t>(kPieceBytes / sizeof(float) / length, 1);
  std::vector<float> piece;
  values.resize(records_);
  for (std::uint64_t first = 0; first < records_; first += most) {
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(most, records_ - first));
    piece.resize(count * length);
    std::string why;
    if (!file_->Read(BasicBuffer::kHeaderSize + first * length * sizeof(float), piece.data(),
                     piece.size() * sizeof(float), &why)) {
      SetFault(String(why));
      return false;
    }
    for (std::size_t i = 0; i < count; ++i) values[first + i] = piece[i * length + at];
  }
  return true;
}

}  // namespace lumo

#include "fx/record_spool.h"

#include <algorithm>
#include <numeric>

namespace lumo {

bool RecordSpool::Add(std::uint32_t label, const float* record) {
  labels_.push_back(label);
  values_.insert(values_.end(), record, record + length_);
  return values_.size() * sizeof(float) + labels_.size() * sizeof(std::uint32_t) < kBytes ||
         Flush();
}

bool RecordSpool::Flush() {
  std::vector<std::uint32_t> order(labels_.size());
  std::iota(order.begin(), order.end(), 0U);
  std::stable_sort(order.begin(), order.end(),
                   [this](std::uint32_t a, std::uint32_t b) { return labels_[a] < labels_[b]; });
  const unsigned bands = file_.Bands(), attributes = file_.Attributes();
  for (const std::uint32_t at : order) {
    const float* value = values_.data() + at * length_;
    for (unsigned band = 0; band < bands; ++band) {
      for (unsigned i = 0; i < attributes; ++i) file_.Value(labels_[at], band, i) = *value++;
    }
  }
  labels_.clear();
  values_.clear();
  return file_.IsValid();
}

}  // namespace lumo

#include "geometry/label_vectorizer.h"

#include <algorithm>
#include <cmath>

namespace lumo {

template <typename T>
LabelVectorizer<T>::LabelVectorizer(std::uint32_t width, LabelPolygonSink& sink)
    : sink_(sink),
      tracer_(width),
      above_(width, kExcluded),
      line_(width, kExcluded),
      up_(std::size_t{width} + 1),
      down_(std::size_t{width} + 1),
      across_(width) {}

template <typename T>
void LabelVectorizer<T>::TakeLabels(const T* labels, const unsigned char* states) {
  std::copy_n(labels, line_.size(), line_.data());
  if (states != nullptr) {
    for (std::size_t x = 0; x < line_.size(); ++x) {
      if (!IsValidState(states[x])) line_[x] = kExcluded;
    }
  }
  if constexpr (std::is_floating_point_v<T>) {
    for (T& label : line_) {
      if (std::isnan(label)) label = kExcluded;
    }
  }
}

template <typename T>
bool LabelVectorizer<T>::AddLine(const T* labels, const unsigned char* states) {
  above_.swap(line_);
  std::swap(up_, down_);
  TakeLabels(labels, states);
  MarkEdgesInLine(line_.data(), line_.size(), down_);
  if (lines_++ == 0) {
    across_.SetFirst(line_.size());
  } else {
    MarkDifferences(above_.data(), line_.data(), line_.size(), across_.Words());
  }
  return tracer_.Walk(up_, down_, across_, *this);
}

template <typename T>
bool LabelVectorizer<T>::Finish() {
  if (lines_ == 0) return true;
  above_.swap(line_);
  std::swap(up_, down_);
  down_.Clear();
  across_.SetFirst(line_.size());
  return tracer_.Walk(up_, down_, across_, *this);
}

template <typename T>
bool LabelVectorizer<T>::Wants(std::uint32_t column) {
  return column < above_.size() && above_[column] != kExcluded;
}

template <typename T>
bool LabelVectorizer<T>::Take(std::uint32_t column, TracedPolygon& polygon) {
  return sink_.Take(static_cast<double>(above_[column]), polygon);
}

VEXG_INSTANCES(EIGHT, LabelVectorizer);

}  // namespace lumo

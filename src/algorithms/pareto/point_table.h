#pragma once

#include <cstddef>
#include <span>
#include <vector>

namespace mirevo {

/// Points of the objective space one behind the other in memory, for what goes through thousands of them at every
/// evaluation.
class PointTable final {
 public:
  PointTable() = default;
  explicit PointTable(std::span<const std::vector<double>> points) {
    if (!points.empty()) values_.reserve(points.size() * points.front().size());
    for (const std::vector<double>& point : points) add(point);
  }

  std::size_t size() const { return size_; }
  /// Values of a point.
  std::size_t width() const { return width_; }
  std::span<const double> operator[](std::size_t i) const { return {values_.data() + i * width_, width_}; }

  /// All points have the same number of values.
  void add(std::span<const double> point) {
    ++size_;
    width_ = point.size();
    values_.insert(values_.end(), point.begin(), point.end());
  }
  /// Leaves out those of which `isLeftOut` is true.
  void leaveOut(const std::vector<bool>& isLeftOut) {
    std::size_t to = 0;
    for (std::size_t i = 0; i < isLeftOut.size(); ++i) {
      if (isLeftOut[i]) continue;
      for (std::size_t j = 0; j < width_; ++j) values_[to * width_ + j] = values_[i * width_ + j];
      ++to;
    }
    size_ = to;
    values_.resize(to * width_);
  }

 private:
  std::size_t size_ = 0;
  std::size_t width_ = 0;
  std::vector<double> values_;
};

}  // namespace mirevo

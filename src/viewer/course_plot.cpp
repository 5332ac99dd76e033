#include "viewer/course_plot.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

namespace mirevo {
namespace {

constexpr double kLogarithmicRatio = 100.0;  ///< ratio of the largest to the smallest value from which the scale is
                                             ///< logarithmic
constexpr int kFewestColumns = 10;
constexpr int kFewestRows = 3;

/// The characters with which the staircase is drawn.
struct Strokes {
  std::string_view flat, upright, leaveDown, arriveDown, leaveUp, arriveUp, axis, tick;
};
constexpr Strokes kLines{"\u2500", "\u2502", "\u256E", "\u2570", "\u256F", "\u256D", "\u2502", "\u2524"};
constexpr Strokes kAsciiLines{"-", "|", "+", "+", "+", "+", "|", "+"};

class Scale {
 public:
  explicit Scale(std::span<const ProgressState::CoursePoint> course) {
    const auto [smallest, largest] = std::minmax_element(
        course.begin(), course.end(), [](const auto& a, const auto& b) { return a.aggregate < b.aggregate; });
    bottom_ = smallest->aggregate;
    top_ = largest->aggregate;
    isLogarithmic_ = bottom_ > 0.0 && top_ / bottom_ >= kLogarithmicRatio;
  }
  /// The row of a value, 0 at the top; the middle row if all values are equal.
  int row(double value, int rows) const {
    if (!(top_ > bottom_)) return rows / 2;
    // Halved first, as the difference of two finite numbers may overflow.
    const double part = isLogarithmic_ ? std::log(value / bottom_) / std::log(top_ / bottom_)
                                       : (value / 2.0 - bottom_ / 2.0) / (top_ / 2.0 - bottom_ / 2.0);
    return static_cast<int>(std::lround((1.0 - std::clamp(part, 0.0, 1.0)) * (rows - 1)));
  }
  double bottom() const { return bottom_; }
  double top() const { return top_; }
  bool isLogarithmic() const { return isLogarithmic_; }

 private:
  double bottom_ = 0.0;
  double top_ = 0.0;
  bool isLogarithmic_ = false;
};

/// Cells of the staircase, [row][column].
using Cells = std::vector<std::vector<std::string_view>>;

Cells drawCourse(std::span<const ProgressState::CoursePoint> course, std::int64_t evaluations, const Scale& scale,
                 int columns, int rows, const Strokes& strokes) {
  Cells cells(static_cast<std::size_t>(rows),
              std::vector<std::string_view>(static_cast<std::size_t>(columns), std::string_view(" ")));
  std::size_t next = 0;
  int before = -1;
  for (std::size_t column = 0; column < static_cast<std::size_t>(columns); ++column) {
    const double reached = static_cast<double>(evaluations) * static_cast<double>(column + 1) / columns;
    while (next < course.size() && static_cast<double>(course[next].evaluations) <= reached) ++next;
    if (column + 1 == static_cast<std::size_t>(columns)) next = course.size();
    if (next == 0) continue;
    const int row = scale.row(course[next - 1].aggregate, rows);
    const auto cell = [&cells, column](int r) -> std::string_view& {
      return cells[static_cast<std::size_t>(r)][column];
    };
    if (before < 0 || before == row) {
      cell(row) = strokes.flat;
    } else {
      const bool goesDown = row > before;
      for (int between = std::min(row, before) + 1; between < std::max(row, before); ++between) {
        cell(between) = strokes.upright;
      }
      cell(before) = goesDown ? strokes.leaveDown : strokes.leaveUp;
      cell(row) = goesDown ? strokes.arriveDown : strokes.arriveUp;
    }
    before = row;
  }
  return cells;
}

}  // namespace

std::vector<std::string> plotCourse(std::span<const ProgressState::CoursePoint> course, std::int64_t evaluations,
                                    int width, int height, CharacterSet characters) {
  const int rows = height - 1;
  if (course.empty() || evaluations < 1 || rows < kFewestRows) return {};
  const Scale scale(course);
  const std::string top = fmt::format("{:.4g}", scale.top());
  const std::string bottom = fmt::format("{:.4g}", scale.bottom());
  const std::size_t labelWidth = std::max(top.size(), bottom.size());
  const int columns = width - static_cast<int>(labelWidth) - 2;
  if (columns < kFewestColumns) return {};

  const Strokes& strokes = characters == CharacterSet::utf8 ? kLines : kAsciiLines;
  const Cells cells = drawCourse(course, evaluations, scale, columns, rows, strokes);
  const int topRow = scale.row(scale.top(), rows);
  const int bottomRow = scale.row(scale.bottom(), rows);
  std::vector<std::string> lines;
  for (int row = 0; row < rows; ++row) {
    const bool isLabelled = row == topRow || row == bottomRow;
    std::string line = fmt::format("{:>{}} ", row == topRow ? top : row == bottomRow ? bottom : "", labelWidth);
    line += isLabelled ? strokes.tick : strokes.axis;
    for (const std::string_view cell : cells[static_cast<std::size_t>(row)]) line += cell;
    lines.push_back(std::move(line));
  }
  const std::string left = scale.isLogarithmic() ? "0 (log scale)" : "0";
  const std::string right = fmt::format("{} evaluations", evaluations);
  const int gap = columns - static_cast<int>(left.size() + right.size());
  std::string below(labelWidth + 2, ' ');
  if (gap > 0) {
    below += left + std::string(static_cast<std::size_t>(gap), ' ') + right;
  } else {
    below += fmt::format("{:>{}}", evaluations, columns);
  }
  lines.push_back(std::move(below));
  return lines;
}

}  // namespace mirevo

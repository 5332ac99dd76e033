#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/pareto/pareto_archive.h"

namespace mirevo {

/// The objectives relative to a front: its ideal point, the least value of each objective, is 0, and its nadir, the
/// greatest value of each, 1.
class FrontScale final {
 public:
  /// `front` must not be empty. `reference`: one value per objective, up to which the hypervolume counts; empty:
  /// kUsualReference on this scale.
  explicit FrontScale(const PointTable& front, std::span<const double> reference = {});
  explicit FrontScale(std::span<const std::vector<double>> front, std::span<const double> reference = {})
      : FrontScale(PointTable(front), reference) {}

  /// An objective without a range has the width of its value, whatever its unit; of a value of 0 the width 1.
  std::vector<double> scaled(std::span<const double> values) const;
  const std::vector<double>& ideal() const { return ideal_; }
  const std::vector<double>& nadir() const { return nadir_; }
  /// Distance to the ideal point on this scale.
  double distance(std::span<const double> values) const;
  /// The hypervolume of a front as a share of the box between the ideal point and the reference; 0 if no point is in
  /// it. Of large fronts with many objectives that of mostPointsOfHypervolume() spread over it.
  double hypervolumeShare(std::span<const std::vector<double>> front) const;
  /// Whether any point of a front is below the reference in every objective; otherwise it has no hypervolume.
  bool isBelowReference(std::span<const std::vector<double>> front) const;

  /// A tenth of the range behind the nadir, so that the ends of the front count.
  static constexpr double kUsualReference = 1.1;

 private:
  /// Whether a given reference is greater than the ideal point in every objective.
  bool isReferenceUsable() const;

  std::vector<double> ideal_;
  std::vector<double> nadir_;
  std::vector<double> reference_;  ///< on this scale
};

/// The member nearest to the ideal point on the scale of the front, the first of equals; empty without members.
std::optional<std::size_t> nearestToIdeal(std::span<const FrontMember> members);

/// How a front has grown.
struct FrontStage {
  int evaluations = 0;
  std::size_t frontSize = 0;
  double hypervolume = 0.0;  ///< FrontScale::hypervolumeShare() on the scale of the last front
};
/// At most `most` stages, evenly from the first evaluations to the last one. Empty without a front.
std::vector<FrontStage> frontCourse(const ParetoArchive& archive, std::span<const double> reference, int most);

/// Lines for people about the hypervolume of a search that has ended. `isBudgetUsed`: it could have gone on.
/// `isRepetition`: it is one of several with other seeds, and its evaluations are counted for themselves.
std::vector<std::string> frontCourseLines(const ParetoArchive& archive, std::span<const double> reference,
                                          bool isBudgetUsed, bool isRepetition = false);

}  // namespace mirevo

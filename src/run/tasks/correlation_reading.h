#pragma once

#include <optional>
#include <string_view>
#include <vector>

#include "algorithms/distributions/gaussian_copula.h"
#include "run/access/setup_access.h"
#include "run/tasks/task.h"

namespace mirevo {

inline constexpr std::string_view kFirstParameterKeyword = "First_Parameter";
inline constexpr std::string_view kSecondParameterKeyword = "Second_Parameter";
inline constexpr std::string_view kCorrelationFileKeyword = "Correlation_File";

/// The sections of the correlations inside that of a task, "UNCERTAINTY_ESTIMATION/CORRELATIONS".
std::vector<const SectionRow*> correlationSections(std::string_view task);

/// The correlations that the section CORRELATIONS inside `section` gives, from a file and by pairs; none if there is no
/// such section, or no correlation in it. Throws FatalError.
std::optional<GaussianCopula> readCorrelations(const SetupSection& section, const SearchSpace& space);

}  // namespace mirevo

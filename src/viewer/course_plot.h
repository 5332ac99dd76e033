#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "viewer/display_text.h"
#include "viewer/progress_state.h"

namespace mirevo {

/// The course of the best aggregate against evaluations (0 to `evaluations`) as `height` lines of at most `width`
/// columns: a descending staircase, its largest and smallest value at the left, the evaluations below. The scale is
/// logarithmic if the values span two orders of magnitude or more. Empty if there is no course or no room for it.
std::vector<std::string> plotCourse(std::span<const ProgressState::CoursePoint> course, std::int64_t evaluations,
                                    int width, int height, CharacterSet characters);

}  // namespace mirevo

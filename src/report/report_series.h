#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

#include "report/drawn_lines.h"
#include "report/json_writer.h"
#include "run/results/scenario_series.h"

namespace mirevo {

/// Times as start and step where they are equidistant, else one by one.
void writeTimes(JsonWriter& json, const std::vector<std::int64_t>& seconds);

/// Where a line is interrupted, as a member; none where it is whole.
void writeBreaks(JsonWriter& json, std::string_view name, const DrawnLine& line);

/// The members of a simulated series that is one of `count`: the number of its evaluation, times and values, thinned if
/// they are too many.
void writeSimulated(JsonWriter& json, const ScenarioSeries& one, std::size_t count);

}  // namespace mirevo

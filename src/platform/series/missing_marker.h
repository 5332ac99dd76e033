#pragma once

#include <optional>
#include <string_view>

namespace mirevo {

/// The number in a comment that seems to be meant as the marker of missing values: the last thing of its phrase, with
/// nothing but words like "value" and signs between it and a word for missing values. Empty without one.
std::string_view numberMeantAsMissing(std::string_view comment);

/// What is behind "missing =" in a comment without its sign; none if it does not begin so.
std::optional<std::string_view> missingMark(std::string_view comment);

}  // namespace mirevo

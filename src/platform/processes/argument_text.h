#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Splits text into words as a shell does: blanks separate words; '...' is taken literally; within "..." a backslash
/// escapes `"`, `\`, `$` and a backquote; outside quotes it escapes the next character. Nothing is expanded. Empty,
/// with the reason, when a quote is not closed or the text ends in a lone backslash.
std::optional<std::vector<std::string>> splitArguments(std::string_view text, std::string& reason);

}  // namespace mirevo

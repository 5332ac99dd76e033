#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Splits text into words as a shell does: blanks separate; '...' is taken as it stands; within "..." a backslash
/// protects `"`, `\`, `$` and a backquote; outside quotes it protects the next character. Nothing is expanded. Nothing
/// is returned, with the reason, when a quote is not closed or the text ends in a lone backslash.
std::optional<std::vector<std::string>> splitArguments(std::string_view text, std::string& reason);

}  // namespace mirevo

#pragma once

#include <optional>
#include <string_view>
#include <vector>

namespace mirevo {

/// The lines of a template, without line ends and trailing blanks. Throws FatalError for a line that is too long.
std::vector<std::string_view> templateLines(std::string_view templateName, std::string_view text);

/// Throws FatalError: line `lineNumber` (from 1) has `length` characters.
[[noreturn]] void failLongLine(std::string_view templateName, std::size_t lineNumber, std::size_t length);

/// The delimiter of a template of PEST: the one character behind `ptf` in its first line. Nothing for the first
/// line of another template.
std::optional<char> delimiterOfPest(std::string_view firstLine);

/// `text` without trailing blanks; tabs are kept, as the model may count columns by them.
std::string_view trimBlanks(std::string_view text);

}  // namespace mirevo

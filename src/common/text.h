#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// `text` without trailing blanks, tabs and carriage returns: the meaning of a blank-padded field.
std::string_view trimTrailing(std::string_view text);

/// `text` without blanks, tabs and line ends on either side.
std::string_view trim(std::string_view text);

/// ASCII lower case, independent of the locale.
std::string toLowerAscii(std::string_view text);

/// Whether the two are equal when ASCII letters are compared without case.
bool equalIgnoringCase(std::string_view a, std::string_view b);

/// The whole of `text` (blanks around it allowed) as a real number in any decimal or exponent form, `D` exponents and a
/// leading `+` included; empty when any part of it is not a number. "nan" and "inf" in any form are not numbers here.
std::optional<double> parseReal(std::string_view text);

/// The whole of `text` (blanks around it allowed) as a decimal integer within 32 bits.
std::optional<std::int32_t> parseInteger(std::string_view text);

/// The shortest decimal text that reads back as the same 64 bits ("NaN", "Inf" and "-Inf" for values that are not
/// finite).
std::string formatReal(double value);

/// "1 pair", "9 pairs"; `more` is the plural where that is not `one` with an s.
std::string countText(std::size_t count, std::string_view one, std::string_view more = {});

/// For fixed texts with a number in them: `text` with its first "%" replaced by `number`.
std::string withNumber(std::string_view text, std::int64_t number);

/// Whether this is a C0 control character other than a tab.
constexpr bool isControlCharacter(char c) {
  return static_cast<unsigned char>(c) < 0x20 && c != '\t';
}

/// `text` between double quotes for a message: cut to a readable length, control characters replaced.
std::string quotedForMessage(std::string_view text);

/// How many characters must be inserted, left out, replaced or swapped with their neighbour to get from one name to the
/// other; case is ignored.
std::size_t editDistance(std::string_view a, std::string_view b);

/// The candidate nearest to `name` by editDistance(), for "did you mean"; empty when none is within
/// a third of the name's length, or one edit for short names.
std::optional<std::string> nearestName(std::string_view name, std::span<const std::string> candidates);

/// The parts of `text` between separators, one more than there are separators, but at most `mostParts`; the last of
/// these is all that is left.
std::vector<std::string_view> splitAt(std::string_view text, char separator,
                                      std::size_t mostParts = std::string_view::npos);

/// The lines of `text`, without their line ends (LF or CRLF); a last line without an end counts.
std::vector<std::string_view> splitLines(std::string_view text);
/// Whether the last line has an end (LF, CRLF, or its CR alone), as far as there is one.
inline bool endsLine(std::string_view text) {
  return text.empty() || text.back() == '\n' || text.back() == '\r';
}

/// `text` with every control character, including line ends, replaced by a blank.
std::string onOneLine(std::string_view text);
/// With a blank in the place of each line end alone; other control characters stay.
std::string withoutLineEnds(std::string_view text);

/// A name as a column heading, without anything that a reader of tab-separated values could misread.
std::string columnName(std::string_view name);

}  // namespace mirevo

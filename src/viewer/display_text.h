#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// Which characters a terminal shows.
enum class CharacterSet { ascii, utf8 };

/// `raw` as a terminal may show it on one line: control characters, what turns the writing direction, and bytes that
/// are no UTF-8 become '?', tabs a blank; with `ascii` every other character beyond ASCII becomes '?', too.
std::string printable(std::string_view raw, CharacterSet characters);

/// Columns that a printable() text takes in a terminal.
int displayWidth(std::string_view text);

/// A printable() text of at most `width` columns, its end replaced by an ellipsis when it is longer.
std::string fitted(std::string_view text, int width, CharacterSet characters);

/// The same, filled up with blanks to exactly `width` columns.
std::string padded(std::string_view text, int width, CharacterSet characters);

/// A span of time for people, in its two largest units: "45 s", "3 min 12 s", "1 d 4 h".
std::string durationText(double seconds);

/// The same in the largest unit alone: "3 min".
std::string roughDurationText(double seconds);

/// Evaluations a second in a unit that makes it readable: "2.5 a second", "25 an hour".
std::string speedText(double perSecond);

/// A number for people, six digits.
std::string shortNumber(double value);

}  // namespace mirevo

#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// Which characters a terminal shows.
enum class CharacterSet { ascii, utf8 };

/// `raw` made safe for one line of a terminal: control characters, characters that change the writing direction, and
/// bytes that are not UTF-8 become '?', tabs become blanks; with `ascii` all characters beyond ASCII become '?', too.
std::string printable(std::string_view raw, CharacterSet characters);

/// Columns that a printable() text takes in a terminal.
int displayWidth(std::string_view text);

/// A printable() text cut to at most `width` columns, with an ellipsis at the end if it was longer.
std::string fitted(std::string_view text, int width, CharacterSet characters);

/// The same, padded with blanks to exactly `width` columns.
std::string padded(std::string_view text, int width, CharacterSet characters);

/// A span of time for people, in its two largest units: "45 s", "3 min 12 s", "1 d 4 h".
std::string durationText(double seconds);

/// The same in the largest unit alone: "3 min".
std::string roughDurationText(double seconds);

/// A speed in evaluations per second, in a readable unit: "2.5 a second", "25 an hour".
std::string speedText(double perSecond);

/// A number for people, with six significant digits.
std::string shortNumber(double value);

}  // namespace mirevo

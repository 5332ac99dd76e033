#include "viewer/display_text.h"

#include <algorithm>
#include <array>
#include <cmath>

#include <fmt/core.h>

#include "common/utf8.h"

namespace mirevo {
namespace {

struct Range {
  char32_t first;
  char32_t last;
};

template <std::size_t n>
bool isIn(const std::array<Range, n>& ranges, char32_t code) {
  return std::any_of(ranges.begin(), ranges.end(),
                     [code](const Range& range) { return code >= range.first && code <= range.last; });
}

/// C0 and C1 controls, line and paragraph separators, directional marks and the byte order mark.
constexpr std::array<Range, 6> kUnprintable{
    {{0, 0x1F}, {0x7F, 0x9F}, {0x200E, 0x200F}, {0x2028, 0x202E}, {0x2060, 0x206F}, {0xFEFF, 0xFEFF}}};
/// Combining marks and joiners (Unicode categories Mn and Cf, the usual scripts).
constexpr std::array<Range, 5> kNoWidth{
    {{0x300, 0x36F}, {0x200B, 0x200D}, {0x1AB0, 0x1AFF}, {0x20D0, 0x20FF}, {0xFE00, 0xFE0F}}};
/// Two columns wide (Unicode East Asian Width W and F, in blocks).
constexpr std::array<Range, 8> kWide{{{0x1100, 0x115F},
                                      {0x2E80, 0x303E},
                                      {0x3041, 0xA4CF},
                                      {0xAC00, 0xD7A3},
                                      {0xF900, 0xFAFF},
                                      {0xFE30, 0xFE6F},
                                      {0xFF00, 0xFF60},
                                      {0x1F300, 0x3FFFD}}};

int widthOf(char32_t code) {
  if (code < 0x300) return 1;
  if (isIn(kNoWidth, code)) return 0;
  return isIn(kWide, code) ? 2 : 1;
}

/// The longest beginning of `text` that takes at most `width` columns.
std::string_view beginning(std::string_view text, int width) {
  std::size_t bytes = 0;
  while (bytes < text.size()) {
    const Utf8Character character = firstCharacter(text.substr(bytes));
    width -= widthOf(character.code);
    if (width < 0) break;
    bytes += character.bytes;
  }
  return text.substr(0, bytes);
}

}  // namespace

std::string printable(std::string_view raw, CharacterSet characters) {
  std::string text;
  while (!raw.empty()) {
    const Utf8Character character = firstCharacter(raw);
    if (character.code == '\t') {
      text += ' ';
    } else if (!character.isValid || isIn(kUnprintable, character.code) ||
               (characters == CharacterSet::ascii && character.bytes > 1)) {
      text += '?';
    } else {
      text += raw.substr(0, character.bytes);
    }
    raw.remove_prefix(character.bytes);
  }
  return text;
}

int displayWidth(std::string_view text) {
  int width = 0;
  while (!text.empty()) {
    const Utf8Character character = firstCharacter(text);
    width += widthOf(character.code);
    text.remove_prefix(character.bytes);
  }
  return width;
}

std::string fitted(std::string_view text, int width, CharacterSet characters) {
  width = std::max(0, width);
  if (beginning(text, width).size() == text.size()) return std::string(text);
  const std::string_view ellipsis = characters == CharacterSet::utf8 ? "\u2026" : "...";
  const int left = width - displayWidth(ellipsis);
  if (left < 1) return std::string(beginning(text, width));
  return std::string(beginning(text, left)).append(ellipsis);
}

std::string padded(std::string_view text, int width, CharacterSet characters) {
  std::string result = fitted(text, width, characters);
  result.append(static_cast<std::size_t>(std::max(0, width - displayWidth(result))), ' ');
  return result;
}

std::string durationText(double seconds) {
  constexpr double kLongest = 1e12;  // so that whole seconds fit into their type, whatever is in the file
  const auto whole = static_cast<std::int64_t>(std::clamp(std::isfinite(seconds) ? seconds : 0.0, 0.0, kLongest));
  const std::int64_t minutes = whole / 60;
  const std::int64_t hours = minutes / 60;
  const std::int64_t days = hours / 24;
  const auto inUnits = [](std::int64_t large, const char* unit, std::int64_t small, const char* smallUnit) {
    if (small == 0) return fmt::format("{} {}", large, unit);
    return fmt::format("{} {} {} {}", large, unit, small, smallUnit);
  };
  if (days > 0) return inUnits(days, "d", hours % 24, "h");
  if (hours > 0) return inUnits(hours, "h", minutes % 60, "min");
  if (minutes > 0) return inUnits(minutes, "min", whole % 60, "s");
  return fmt::format("{} s", whole);
}

std::string roughDurationText(double seconds) {
  const std::string text = durationText(seconds);
  return text.substr(0, text.find(' ', text.find(' ') + 1));
}

std::string speedText(double perSecond) {
  if (perSecond >= 1.0) return fmt::format("{:.3g} a second", perSecond);
  if (perSecond * 60.0 >= 1.0) return fmt::format("{:.3g} a minute", perSecond * 60.0);
  if (perSecond * 3600.0 >= 1.0) return fmt::format("{:.3g} an hour", perSecond * 3600.0);
  return fmt::format("{:.3g} a day", perSecond * 86400.0);
}

std::string shortNumber(double value) {
  return fmt::format("{:.6g}", value);
}

}  // namespace mirevo

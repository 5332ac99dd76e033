#include "platform/series/missing_marker.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <string>

#include "common/text.h"

namespace mirevo {
namespace {

bool isLetter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

/// Whether the word, in lower case, announces the number that marks missing values; `before` is the word before it.
bool namesMissing(std::string_view word, std::string_view before) {
  constexpr std::array<std::string_view, 5> kNames = {"nodata", "novalue", "fillvalue", "missingvalue", "undef"};
  if (std::find(kNames.begin(), kNames.end(), word) != kNames.end()) return true;
  if ((before == "no" && (word == "data" || word == "value")) || (before == "fill" && word == "value")) return true;
  return editDistance(word, "missing") <= 1;
}

}  // namespace

std::string_view numberMeantAsMissing(std::string_view comment) {
  constexpr std::array<std::string_view, 16> kBetween = {"value", "values", "val",    "data",  "code",    "flag",
                                                         "mark",  "marked", "marker", "coded", "written", "is",
                                                         "are",   "as",     "with",   "by"};
  bool isAnnounced = false;
  std::string before;
  for (std::size_t i = 0; i < comment.size();) {
    std::size_t end = i + 1;
    if (isLetter(comment[i])) {
      while (end < comment.size() && isLetter(comment[end])) ++end;
      const std::string word = toLowerAscii(comment.substr(i, end - i));
      const bool isBetween = std::find(kBetween.begin(), kBetween.end(), word) != kBetween.end();
      isAnnounced = namesMissing(word, before) || (isAnnounced && isBetween);
      before = word;
    } else if (isAnnounced && std::string_view("+-.0123456789").find(comment[i]) != std::string_view::npos) {
      while (end < comment.size() && std::string_view("+-.0123456789eE").find(comment[end]) != std::string_view::npos) {
        ++end;
      }
      const std::string_view number = comment.substr(i, end - i);
      const std::string_view rest = trim(comment.substr(end));
      const bool endsPhrase =
          rest.empty() || std::string_view(";,.)(]\"'#").find(rest.front()) != std::string_view::npos;
      // A positive number may well be a count: "missing values: 14".
      const bool isMarker = number.front() == '-' || number.find_first_of("012345678eE") == std::string_view::npos;
      if (endsPhrase && isMarker && parseReal(number)) return number;
      if (number.find_first_of("0123456789") != std::string_view::npos) isAnnounced = false;
    }
    i = end;
  }
  return {};
}

std::optional<std::string_view> missingMark(std::string_view comment) {
  constexpr std::string_view kMissing = "missing";
  std::string_view text = trim(comment);
  if (!equalIgnoringCase(text.substr(0, kMissing.size()), kMissing)) return std::nullopt;
  text = trim(text.substr(kMissing.size()));
  if (text.empty() || text.front() != '=') return std::nullopt;
  return trim(text.substr(1));
}

}  // namespace mirevo

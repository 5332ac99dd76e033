#include "measures/measure_file.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/files.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kLongestQuoted = 60;

/// The content of a file word by word.
class Words final {
 public:
  Words(std::string_view content, std::string_view separators) : lines_(splitLines(content)), separators_(separators) {}

  /// The next word; empty at the end.
  std::string_view next() {
    while (lineNumber_ < lines_.size()) {
      const std::string_view line = lines_[lineNumber_].substr(0, lines_[lineNumber_].find('#'));
      begin_ = line.find_first_not_of(separators_, end_);
      if (begin_ != std::string_view::npos) {
        end_ = std::min(line.find_first_of(separators_, begin_), line.size());
        return line.substr(begin_, end_ - begin_);
      }
      ++lineNumber_;
      end_ = 0;
    }
    return {};
  }
  /// Where the last word is, "line:column".
  std::string position() const { return fmt::format("{}:{}", lineNumber_ + 1, begin_ + 1); }

 private:
  std::vector<std::string_view> lines_;
  std::string_view separators_;
  std::size_t lineNumber_ = 0;  ///< 0-based
  std::size_t begin_ = 0;
  std::size_t end_ = 0;
};

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

/// The first number with a decimal comma, after its position, if commas between digits can all be meant as decimal ones
/// and there are enough numbers then.
std::string findDecimalComma(std::string_view content, std::size_t neededCount) {
  Words words(content, " \t;\r");
  std::string first;
  std::size_t count = 0;
  for (std::string_view word = words.next(); !word.empty(); word = words.next()) {
    const std::size_t begin = word.find_first_not_of(',');
    if (begin == std::string_view::npos) continue;
    std::string number(word.substr(begin, word.find_last_not_of(',') + 1 - begin));
    if (number.find('.') != std::string::npos) return {};
    ++count;
    const std::size_t comma = number.find(',');
    if (comma == std::string::npos) continue;
    if (!isDigit(number[comma - 1]) || !isDigit(number[comma + 1])) return {};
    if (first.empty()) first = fmt::format("{}: \"{}\"", words.position(), number.substr(0, kLongestQuoted));
    number[comma] = '.';
    if (!parseReal(number)) return {};
  }
  return count < neededCount ? std::string() : first;
}

}  // namespace

std::optional<MeasureFile> parseMeasureFile(const std::string& sourceName, std::string_view content,
                                            std::size_t neededCount, std::string& reason) {
  MeasureFile file;
  file.endsLine = endsLine(content);
  Words words(content, " \t,;\r");
  for (std::string_view word = words.next(); !word.empty(); word = words.next()) {
    const std::optional<double> number = parseReal(word);
    if (!number) {
      const std::string fault = faultOfEncoding(content);
      reason = fmt::format("{}:{}: expected a number, found {}{}{}", sourceName, words.position(),
                           quotedForMessage(word.substr(0, kLongestQuoted)), fault.empty() ? "" : "; ", fault);
      return std::nullopt;
    }
    file.numbers.push_back(*number);
  }
  if (const std::string ambiguous = findDecimalComma(content, neededCount); !ambiguous.empty()) {
    reason = fmt::format(
        "{}:{} may be one number with a decimal comma or two: a decimal point, or a blank behind a comma that "
        "separates, tells",
        sourceName, ambiguous);
    return std::nullopt;
  }
  return file;
}

std::optional<MeasureFile> readMeasureFile(const std::string& fileName, std::size_t neededCount, std::string& reason) {
  std::string systemReason;
  const std::optional<std::string> content = readTextFile(fileName, systemReason);
  if (!content) {
    reason = fileName + ": " + systemReason;
    return std::nullopt;
  }
  return parseMeasureFile(fileName, *content, neededCount, reason);
}

}  // namespace mirevo

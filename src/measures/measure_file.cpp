#include "measures/measure_file.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/files.h"
#include "common/reading_watch.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "measures/instruction_file.h"

namespace mirevo {
namespace {

constexpr std::size_t kLongestQuoted = 60;

/// The content of a file word by word.
class Words final {
 public:
  /// `watch` may be null.
  Words(std::string_view content, std::string_view separators, ReadingWatch* watch)
      : rest_(content), separators_(separators), watch_(watch) {}

  /// The next word; empty at the end, and when the time is over.
  std::string_view next() {
    constexpr std::size_t kWordsPerLook = 65536;
    if (watch_ != nullptr && ++count_ % kWordsPerLook == 0 && watch_->isOver()) return {};
    while (true) {
      begin_ = line_.find_first_not_of(separators_, end_);
      if (begin_ != std::string_view::npos) {
        end_ = std::min(line_.find_first_of(separators_, begin_), line_.size());
        return line_.substr(begin_, end_ - begin_);
      }
      if (rest_.empty()) return {};
      const std::size_t lineEnd = rest_.find('\n');
      line_ = rest_.substr(0, lineEnd);
      line_ = line_.substr(0, line_.find('#'));
      rest_.remove_prefix(lineEnd == std::string_view::npos ? rest_.size() : lineEnd + 1);
      ++lineNumber_;
      end_ = 0;
    }
  }
  /// Where the last word is, "line:column".
  std::string position() const { return fmt::format("{}:{}", lineNumber_, begin_ + 1); }

 private:
  std::string_view rest_;  ///< the lines after the current one
  std::string_view separators_;
  ReadingWatch* watch_;
  std::string_view line_;
  std::size_t count_ = 0;
  std::size_t lineNumber_ = 0;
  std::size_t begin_ = 0;
  std::size_t end_ = 0;
};

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

/// The first number with a decimal comma, after its position, if commas between digits can all be meant as decimal ones
/// and there are enough numbers then.
std::string findDecimalComma(std::string_view content, std::size_t neededCount, ReadingWatch* watch) {
  Words words(content, " \t;\r", watch);
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
                                            std::size_t neededCount, std::string& reason, ReadingWatch* watch) {
  MeasureFile file;
  file.endsLine = endsLine(content);
  takeText(content, kByteOrderMark);
  Words words(content, " \t,;\r", watch);
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
  const std::string ambiguous = findDecimalComma(content, neededCount, watch);
  if (watch != nullptr && watch->isOver()) {
    reason = fmt::format("{}: {}", sourceName, watch->reason());
    return std::nullopt;
  }
  if (!ambiguous.empty()) {
    reason = fmt::format(
        "{}:{} may be one number with a decimal comma or two: a decimal point, or a blank behind a comma that "
        "separates, tells",
        sourceName, ambiguous);
    return std::nullopt;
  }
  return file;
}

std::optional<MeasureFile> readMeasureFile(const std::string& fileName, std::size_t neededCount, std::string& reason,
                                           ReadingWatch& watch, const InstructionFile* instructions,
                                           std::vector<std::string>* doubts) {
  std::string systemReason;
  const std::optional<std::string> content = readTextFile(fileName, systemReason, watch);
  if (!content) {
    reason = fileName + ": " + systemReason;
    return std::nullopt;
  }
  if (instructions == nullptr) return parseMeasureFile(fileName, *content, neededCount, reason, &watch);
  auto numbers = instructions->read(fileName, *content, reason, &watch, doubts);
  if (!numbers) return std::nullopt;
  return MeasureFile{*std::move(numbers), endsLine(*content)};
}

}  // namespace mirevo

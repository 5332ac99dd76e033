#include "measures/instruction_file.h"

#include <algorithm>
#include <cmath>
#include <span>
#include <unordered_map>
#include <utility>

#include <fmt/format.h>

#include "common/number_border.h"
#include "common/reading_watch.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {

namespace {

using Instruction = InstructionFile::Instruction;
using Kind = Instruction::Kind;

constexpr std::size_t kMostCount = 1'000'000'000;  ///< of lines and columns
constexpr std::size_t kLongestQuoted = 60;

bool isBlank(char c) {
  return c == ' ' || c == '\t';
}
/// What may end a number.
bool separates(char c) {
  return isBlank(c) || c == ',';
}

std::string shortQuoted(std::string_view text) {
  return quotedForMessage(text.substr(0, kLongestQuoted));
}

}  // namespace

/// Reads the text of an instruction file.
class InstructionParser final {
 public:
  explicit InstructionParser(const std::string& sourceName) { file_.sourceName_ = sourceName; }

  std::optional<InstructionFile> parse(std::string_view text, std::string& reason) {
    const std::vector<std::string_view> lines = splitLines(text);
    for (const std::string_view line : lines) {
      ++lineNumber_;
      line_ = trimTrailing(line);
      at_ = 0;
      if (!(lineNumber_ == 1 ? readHead() : readLine())) {
        reason = fmt::format("{}:{}:{}: {}", file_.sourceName_, lineNumber_, at_ + 1, fault_);
        return std::nullopt;
      }
    }
    if (lines.empty() || file_.names_.empty()) {
      reason = fmt::format(
          "{}: {}", file_.sourceName_,
          lines.empty() ? "it is empty: expected \"pif ~\" in its first line" : "no instruction reads a number");
      return std::nullopt;
    }
    return std::move(file_);
  }

 private:
  bool fail(std::string text) {
    fault_ = std::move(text);
    return false;
  }

  bool readHead() {
    const std::string_view word = line_.substr(0, 3);
    const std::string_view rest = line_.size() > 3 ? trim(line_.substr(3)) : std::string_view();
    if (!equalIgnoringCase(word, "pif") || rest.size() != 1 || !isBlank(line_[3])) {
      return fail("expected \"pif\" and the delimiter of markers, as in \"pif ~\", found " + shortQuoted(line_));
    }
    constexpr std::string_view kReserved = "!()[]:&";
    delimiter_ = rest.front();
    const bool isAlphanumeric = (delimiter_ >= '0' && delimiter_ <= '9') || (delimiter_ >= 'a' && delimiter_ <= 'z') ||
                                (delimiter_ >= 'A' && delimiter_ <= 'Z');
    if (isAlphanumeric || kReserved.find(delimiter_) != std::string_view::npos) {
      return fail("expected a delimiter of markers that is no letter, digit, bracket, colon, ! or &, found " +
                  shortQuoted(rest));
    }
    return true;
  }

  bool readLine() {
    skipBlanks();
    if (at_ == line_.size()) return true;
    if (line_[at_] == '&') {
      if (file_.lines_.empty()) return fail("expected a line before one that goes on with &");
      ++at_;
      skipBlanks();
    } else {
      file_.lines_.emplace_back();
    }
    const std::size_t before = file_.lines_.back().size();
    for (; at_ < line_.size(); skipBlanks()) {
      Instruction instruction;
      instruction.line = lineNumber_;
      instruction.column = at_ + 1;
      if (!readInstruction(instruction)) return false;
      file_.lines_.back().push_back(std::move(instruction));
    }
    if (file_.lines_.back().size() > before) return true;
    return fail("expected an instruction behind &");
  }

  bool readInstruction(Instruction& made) {
    const bool isFirst = file_.lines_.back().empty();
    const char c = line_[at_];
    if (c == delimiter_) return readMarker(made, isFirst);
    if (c == 'l' || c == 'L') {
      made.kind = Kind::lines;
      if (!isFirst)
        return fail("expected a number of lines at the beginning of a line only, found " + shortQuoted(word()));
      return readCount(made.first);
    }
    if (isFirst) {
      return fail(
          fmt::format("expected a line to begin with a marker between {0} and {0}, with a number of lines as in "
                      "l1, or with &, found {1}",
                      delimiter_, shortQuoted(word())));
    }
    if (c == '!') return readNext(made);
    if (c == '[' || c == '(') return readColumns(made);
    if (c == 't' || c == 'T') {
      made.kind = Kind::tab;
      return readCount(made.first);
    }
    if (equalIgnoringCase(word(), "w")) {
      made.kind = Kind::whitespace;
      ++at_;
      return true;
    }
    return fail(
        fmt::format("expected an instruction (a marker between {0} and {0}, w, t with a column, !name!, "
                    "[name]first:last or (name)first:last), found {1}",
                    delimiter_, shortQuoted(word())));
  }

  bool readMarker(Instruction& made, bool isFirst) {
    made.kind = isFirst ? Kind::primaryMarker : Kind::secondaryMarker;
    const std::size_t end = line_.find(delimiter_, at_ + 1);
    if (end == std::string_view::npos) return fail(fmt::format("expected {} at the end of the marker", delimiter_));
    made.text = std::string(line_.substr(at_ + 1, end - at_ - 1));
    if (made.text.empty()) return fail("expected a marker with a text");
    at_ = end + 1;
    return true;
  }

  /// What follows a letter: l3, t20.
  bool readCount(std::size_t& count) {
    const std::string_view whole = word();
    std::string_view digits = whole.substr(1);
    const auto number = takeNumber(digits);
    if (!number || !digits.empty() || *number < 1 || *number > static_cast<std::int64_t>(kMostCount)) {
      return fail(fmt::format("expected a number from 1 behind {}, found {}", whole.front(), shortQuoted(whole)));
    }
    count = static_cast<std::size_t>(*number);
    at_ += whole.size();
    return true;
  }

  bool readNext(Instruction& made) {
    made.kind = Kind::nextNumber;
    const std::size_t end = line_.find('!', at_ + 1);
    if (end == std::string_view::npos) return fail("expected ! at the end of the name");
    if (!takeName(line_.substr(at_ + 1, end - at_ - 1), made)) return false;
    at_ = end + 1;
    return true;
  }

  bool readColumns(Instruction& made) {
    const bool isInside = line_[at_] == '[';
    made.kind = isInside ? Kind::inColumns : Kind::touchingColumns;
    const std::size_t end = line_.find(isInside ? ']' : ')', at_ + 1);
    if (end == std::string_view::npos)
      return fail(fmt::format("expected {} at the end of the name", isInside ? ']' : ')'));
    if (!takeName(line_.substr(at_ + 1, end - at_ - 1), made)) return false;
    at_ = end + 1;
    const std::string_view columns = word();
    std::string_view rest = columns;
    const auto first = takeNumber(rest);
    const bool hasColon = takeText(rest, ":");
    const auto last = takeNumber(rest);
    const auto most = static_cast<std::int64_t>(kMostCount);
    if (!first || !hasColon || !last || !rest.empty() || *first < 1 || *last < *first || *last > most) {
      return fail("expected first and last column, as in 21:30, found " + shortQuoted(columns));
    }
    made.first = static_cast<std::size_t>(*first);
    made.last = static_cast<std::size_t>(*last);
    at_ += columns.size();
    return true;
  }

  bool takeName(std::string_view name, Instruction& made) {
    name = trim(name);
    if (name.empty()) return fail("expected a name");
    if (equalIgnoringCase(name, "dum")) return true;
    const auto [known, isNew] = places_.try_emplace(toLowerAscii(name), file_.names_.size());
    if (!isNew) return fail(fmt::format("the name {} is there twice", shortQuoted(name)));
    made.name = known->second;
    file_.names_.emplace_back(name);
    return true;
  }

  std::string_view word() const {
    const std::string_view rest = line_.substr(at_);
    return rest.substr(0, std::find_if(rest.begin(), rest.end(), isBlank) - rest.begin());
  }
  void skipBlanks() {
    while (at_ < line_.size() && isBlank(line_[at_])) ++at_;
  }

  InstructionFile file_;
  std::unordered_map<std::string, std::size_t> places_;
  char delimiter_ = 0;
  std::string_view line_;
  std::size_t lineNumber_ = 0;
  std::size_t at_ = 0;
  std::string fault_;
};

std::optional<InstructionFile> InstructionFile::parse(const std::string& sourceName, std::string_view text,
                                                      std::string& reason) {
  return InstructionParser(sourceName).parse(text, reason);
}

std::optional<std::size_t> InstructionFile::placeOf(std::string_view name) const {
  const auto isIt = [name](const std::string& known) { return equalIgnoringCase(known, name); };
  const auto found = std::find_if(names_.begin(), names_.end(), isIt);
  if (found == names_.end()) return std::nullopt;
  return static_cast<std::size_t>(found - names_.begin());
}

namespace {

/// Digits with thousands marks, "-1,234,567.8", or with a decimal comma, "3,14".
bool isOneNumberWithCommas(std::string_view text) {
  const auto takeDigits = [&text] {
    const std::size_t count = std::min(text.find_first_not_of("0123456789"), text.size());
    text.remove_prefix(count);
    return count;
  };
  if (!text.empty() && (text.front() == '-' || text.front() == '+')) text.remove_prefix(1);
  const std::size_t front = takeDigits();
  std::size_t groups = 0;
  bool areOfThree = front <= 3;
  for (; takeText(text, ","); ++groups) {
    const std::size_t count = takeDigits();
    if (count == 0) return false;
    areOfThree = areOfThree && count == 3;
  }
  if (front == 0 || groups == 0) return false;
  if (areOfThree && takeText(text, ".")) takeDigits();
  return text.empty() && (areOfThree || groups == 1);
}

/// Goes through a listing as the instructions say.
class ListingReader final {
 public:
  ListingReader(std::string_view content, ReadingWatch* watch, std::vector<double>& values)
      : rest_(content), watch_(watch), values_(values) {}

  /// False where the listing is not as the instructions of a line say.
  bool follow(const std::vector<Instruction>& instructions) {
    instructions_ = instructions;
    for (std::size_t i = 0; i < instructions.size(); ++i) {
      current_ = &instructions[i];
      next_ = i + 1 < instructions.size() ? &instructions[i + 1] : nullptr;
      if (step()) continue;
      // Behind markers alone a marker that is not on the line of the primary one means another line with that one.
      const bool goesOn = current_->kind == Kind::secondaryMarker && instructions.front().kind == Kind::primaryMarker &&
                          std::all_of(instructions.begin(), instructions.begin() + static_cast<std::ptrdiff_t>(i),
                                      [](const Instruction& one) { return one.isMarker(); });
      if (!goesOn) return false;
      i = static_cast<std::size_t>(-1);
    }
    return true;
  }

  const Instruction& current() const { return *current_; }
  std::size_t lineNumber() const { return lineNumber_; }
  std::size_t column() const { return std::min(at_, line_.size()) + 1; }
  const std::string& fault() const { return fault_; }

  /// Columns that have cut a number in two.
  struct Cut {
    std::size_t lineNumber = 0;
    const Instruction* columns = nullptr;
    std::string number = {};  ///< the whole of it, with what touches it
    std::string taken = {};
  };
  const std::optional<Cut>& firstCut() const { return firstCut_; }
  std::size_t cutCount() const { return cutCount_; }

  /// A number that ended at a comma between digits, behind which nothing is read.
  struct EndedAtComma {
    std::size_t lineNumber = 0;
    std::size_t column = 0;  ///< 1-based
    const Instruction* instruction = nullptr;
    std::string whole = {};
    std::string taken = {};
  };
  const std::optional<EndedAtComma>& firstAtComma() const { return firstAtComma_; }
  std::size_t atCommaCount() const { return atCommaCount_; }

 private:
  bool fail(std::string text) {
    fault_ = std::move(text);
    return false;
  }

  bool step() {
    const bool isBehindNumber = std::exchange(isBehindNumber_, false);
    isBehindMarker_ = current_ != &instructions_.front() && (current_ - 1)->isMarker();
    switch (current_->kind) {
      case Kind::primaryMarker:
        return findLine();
      case Kind::lines:
        return advance();
      case Kind::secondaryMarker:
        return findMarker();
      case Kind::whitespace:
        return passBlanks();
      case Kind::tab:
        return goToColumn();
      case Kind::inColumns:
        return readInColumns();
      case Kind::touchingColumns:
        return readTouching();
      case Kind::nextNumber:
        return readNext(isBehindNumber);
    }
    return false;
  }

  bool takeLine() {
    constexpr std::size_t kLinesPerLook = 4096;
    if (rest_.empty()) return false;
    if (watch_ != nullptr && (lineNumber_ + 1) % kLinesPerLook == 0 && watch_->isOver()) return false;
    const std::size_t end = rest_.find('\n');
    line_ = trimTrailing(rest_.substr(0, end));
    rest_.remove_prefix(end == std::string_view::npos ? rest_.size() : end + 1);
    ++lineNumber_;
    at_ = 0;
    return true;
  }

  bool findLine() {
    const std::size_t from = lineNumber_ + 1;
    while (takeLine()) {
      const std::size_t found = line_.find(current_->text);
      if (found == std::string_view::npos) continue;
      at_ = found + current_->text.size();
      return true;
    }
    at_ = line_.size();
    return fail(
        fmt::format("expected {} in a line from {} on, found the end of the file", shortQuoted(current_->text), from));
  }

  bool advance() {
    for (std::size_t i = 0; i < current_->first; ++i) {
      if (takeLine()) continue;
      at_ = line_.size();
      return fail(fmt::format("expected {} more, found the end of the file", countText(current_->first - i, "line")));
    }
    return true;
  }

  bool findMarker() {
    const std::size_t found = line_.find(current_->text, at_);
    if (found == std::string_view::npos) {
      return fail(fmt::format("expected {}, found {}", shortQuoted(current_->text), foundText()));
    }
    at_ = found + current_->text.size();
    return true;
  }

  bool passBlanks() {
    std::size_t at = at_;
    while (at < line_.size() && !isBlank(line_[at])) ++at;
    while (at < line_.size() && isBlank(line_[at])) ++at;
    if (at == line_.size()) return fail("expected blanks and something behind them, found " + foundText());
    at_ = at;
    return true;
  }

  /// The cursor is then on this column: what is read begins behind it.
  bool goToColumn() {
    const std::size_t column = current_->first;
    if (column > line_.size()) {
      at_ = line_.size();
      return fail(fmt::format("expected a line of {} columns or more, found {}", column, line_.size()));
    }
    at_ = column;
    const bool isInside = next_ != nullptr && next_->kind == Kind::nextNumber && at_ < line_.size() &&
                          isOfNumber(line_[at_ - 1]) && isOfNumber(line_[at_]);
    if (!isInside) return true;
    return fail(fmt::format("t{} is within the number {}: expected a column before its first digit", column,
                            shortQuoted(tokenAround(at_))));
  }

  static bool isOfNumber(char c) { return (c >= '0' && c <= '9') || c == '.' || c == '-' || c == '+'; }
  std::string_view tokenAround(std::size_t at) const {
    std::size_t begin = at;
    while (begin > 0 && !separates(line_[begin - 1])) --begin;
    std::size_t end = at;
    while (end < line_.size() && !separates(line_[end])) ++end;
    return line_.substr(begin, end - begin);
  }

  bool readInColumns() {
    const auto [first, last] = std::pair(current_->first - 1, std::min(current_->last, line_.size()));
    at_ = std::min(first, line_.size());
    if (first >= line_.size()) return take({}, line_.size());
    const std::string_view text = trim(line_.substr(first, last - first));
    noteCut(first, last, text);
    return take(text, last);
  }

  /// Where numbers stand without blanks between them, other columns go on with what these leave.
  void noteCut(std::size_t first, std::size_t last, std::string_view text) {
    const auto isOfOthers = [this](auto touches) {
      return std::ranges::any_of(
          instructions_, [&](const Instruction& other) { return other.kind == Kind::inColumns && touches(other); });
    };
    const bool cutsLeft = current_->name && isInsideSigned(line_, first) &&
                          !isOfOthers([&](const Instruction& other) { return other.last == first; });
    const bool isReadOn = current_->name || (next_ != nullptr && next_->kind == Kind::nextNumber);
    const bool cutsRight = isReadOn && isInsideNumber(line_, last) &&
                           !isOfOthers([&](const Instruction& other) { return other.first == last + 1; });
    if (!cutsLeft && !cutsRight) return;
    ++cutCount_;
    if (!firstCut_) {
      firstCut_ = Cut{lineNumber_, current_, std::string(tokenAround(cutsLeft ? first : last)), std::string(text)};
    }
  }

  bool readTouching() {
    const std::size_t last = std::min(current_->last, line_.size());
    std::size_t begin = std::min(current_->first - 1, line_.size());
    at_ = begin;
    if (begin < last && !separates(line_[begin])) {
      while (begin > 0 && !separates(line_[begin - 1])) --begin;
    } else {
      while (begin < last && separates(line_[begin])) ++begin;
      if (begin >= last) return take({}, last);
    }
    std::size_t end = begin;
    while (end < line_.size() && !separates(line_[end])) ++end;
    noteComma(begin, end);
    return take(line_.substr(begin, end - begin), end);
  }

  /// Behind a number the comma that ended it is passed. A second one in a row is an empty cell and no number.
  bool readNext(bool isBehindNumber) {
    const auto skip = [this] {
      while (at_ < line_.size() && isBlank(line_[at_])) ++at_;
    };
    if (current_->name && isBehindMarker_ && isInsideNumber(line_, at_)) {
      return fail(fmt::format("the marker in front of the number ends within {}: expected one that leaves it whole",
                              shortQuoted(tokenAround(at_))));
    }
    skip();
    if (isBehindNumber && at_ < line_.size() && line_[at_] == ',') ++at_;
    skip();
    std::size_t end = at_;
    while (end < line_.size() && !separates(line_[end])) ++end;
    if (next_ != nullptr && next_->kind == Kind::secondaryMarker) end = std::min(end, line_.find(next_->text, at_));
    if (current_->name && isInsideNumber(line_, end)) {
      return fail(fmt::format("the marker behind the number begins within {}: expected one that leaves it whole",
                              shortQuoted(tokenAround(end))));
    }
    noteComma(at_, end);
    return take(line_.substr(at_, end - at_), end);
  }

  /// In a list of numbers the comma separates; "1,234.5" and "3,14" may as well be a number with a thousands mark or a
  /// decimal comma. An instruction that reads on behind the comma says that it separates.
  void noteComma(std::size_t begin, std::size_t end) {
    const bool readsOn = next_ != nullptr && (next_->kind == Kind::nextNumber || next_->kind == Kind::touchingColumns ||
                                              next_->text.find(',') != std::string::npos);
    if (!current_->name || readsOn || (begin > 0 && line_[begin - 1] == ',')) return;
    const auto last = std::find_if(line_.begin() + static_cast<std::ptrdiff_t>(end), line_.end(), isBlank);
    const std::string_view whole = line_.substr(begin, static_cast<std::size_t>(last - line_.begin()) - begin);
    if (!isOneNumberWithCommas(whole)) return;
    ++atCommaCount_;
    if (firstAtComma_) return;
    firstAtComma_ = EndedAtComma{lineNumber_, begin + 1, current_, std::string(whole),
                                 std::string(line_.substr(begin, end - begin))};
  }

  /// `dum` may stand for anything.
  bool take(std::string_view text, std::size_t end) {
    if (current_->name) {
      const std::optional<double> number = parseReal(text);
      if (!number || !std::isfinite(*number)) {
        return fail("expected a number, found " + (text.empty() ? foundText() : shortQuoted(text)));
      }
      values_[*current_->name] = *number;
    }
    isBehindNumber_ = true;
    at_ = end;
    return true;
  }

  std::string foundText() const {
    const std::string_view rest = line_.substr(std::min(at_, line_.size()));
    return trim(rest).empty() ? "the end of the line" : shortQuoted(rest);
  }

  std::string_view rest_;  ///< the lines behind the current one
  ReadingWatch* watch_;
  std::vector<double>& values_;
  const Instruction* current_ = nullptr;
  const Instruction* next_ = nullptr;  ///< of the same line
  std::span<const Instruction> instructions_;
  std::string_view line_;
  std::size_t lineNumber_ = 0;
  std::size_t at_ = 0;  ///< of the next character
  bool isBehindNumber_ = false;
  bool isBehindMarker_ = false;
  std::optional<Cut> firstCut_;
  std::size_t cutCount_ = 0;
  std::optional<EndedAtComma> firstAtComma_;
  std::size_t atCommaCount_ = 0;
  std::string fault_;
};

}  // namespace

std::optional<std::vector<double>> InstructionFile::read(const std::string& sourceName, std::string_view content,
                                                         std::string& reason, ReadingWatch* watch,
                                                         std::vector<std::string>* doubts) const {
  std::vector<double> values(names_.size(), std::nan(""));
  ListingReader reader(content, watch, values);
  for (const std::vector<Instruction>& line : lines_) {
    if (reader.follow(line)) continue;
    if (watch != nullptr && watch->isOver()) {
      reason = fmt::format("{}: {}", sourceName, watch->reason());
      return std::nullopt;
    }
    const Instruction& at = reader.current();
    const std::string what = at.name ? fmt::format("the number {} at ", shortQuoted(names_[*at.name])) : std::string();
    reason = fmt::format("{}:{}:{}: {} ({}{}:{}:{})", sourceName, reader.lineNumber(), reader.column(), reader.fault(),
                         what, sourceName_, at.line, at.column);
    return std::nullopt;
  }
  if (const auto& cut = reader.firstCut(); cut && doubts != nullptr) {
    const Instruction& at = *cut->columns;
    const std::string more = reader.cutCount() > 1 ? fmt::format("; so do {} more", reader.cutCount() - 1) : "";
    doubts->push_back(fmt::format("{}:{}:{}: the columns {}:{} cut {}, of which {} is read ({}:{}:{}){}", sourceName,
                                  cut->lineNumber, at.first, at.first, at.last, shortQuoted(cut->number),
                                  shortQuoted(cut->taken), sourceName_, at.line, at.column, more));
  }
  if (const auto& found = reader.firstAtComma(); found && doubts != nullptr) {
    const Instruction& at = *found->instruction;
    const std::string more =
        reader.atCommaCount() > 1 ? fmt::format("; so are {} more read", reader.atCommaCount() - 1) : "";
    doubts->push_back(
        fmt::format("{}:{}:{}: of {} only {} is read, as a comma ends a number: if it marks thousands or decimals, let "
                    "the model write numbers without; if it separates, read on behind it, as with !dum! ({}:{}:{}){}",
                    sourceName, found->lineNumber, found->column, shortQuoted(found->whole), shortQuoted(found->taken),
                    sourceName_, at.line, at.column, more));
  }
  return values;
}

}  // namespace mirevo

#include "platform/kdx/kdx_value.h"

#include <optional>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"

namespace mirevo {
namespace {

bool isBlank(char c) {
  return c == ' ' || c == '\t' || c == '\r';
}

/// Reads a text between quotes; the same quote inside the text is written twice.
std::variant<KdxValue, KdxSyntaxError> readText(KdxCursor& cursor) {
  const KdxPosition start = cursor.position();
  const std::string_view line = cursor.restOfLine();
  const char quote = line.front();
  std::string content;
  std::size_t i = 1;
  while (true) {
    if (i >= line.size()) {
      return KdxSyntaxError{start, fmt::format("expected a closing {} before the end of the line", quote)};
    }
    if (isControlCharacter(line[i])) {
      return KdxSyntaxError{{start.line, start.column + static_cast<int>(i)},
                            fmt::format("expected a text without control characters, found character {}",
                                        static_cast<int>(static_cast<unsigned char>(line[i])))};
    }
    if (line[i] == quote) {
      if (i + 1 >= line.size() || line[i + 1] != quote) break;
      ++i;
    }
    content += line[i++];
  }
  cursor.advance(i + 1);
  return KdxValue{std::move(content), start};
}

/// Digits beyond 32 bits are read as a real, which is valid where a real is expected and refused where an integer is.
std::optional<KdxValue> readNumber(std::string_view word, KdxPosition start) {
  if (const auto integer = parseInteger(word)) return KdxValue{*integer, start};
  if (const auto real = parseReal(word)) return KdxValue{*real, start};
  return std::nullopt;
}

/// Whether the text begins with a date in a form that is none here, "31.01.2001" or "2001/1/31".
bool hasOtherDateForm(std::string_view text) {
  if (!takeNumber(text, 1, 4)) return false;
  const std::string_view separator = text.substr(0, 1);
  if (separator != "." && separator != "/") return false;
  return takeText(text, separator) && takeNumber(text, 1, 2) && takeText(text, separator) && takeNumber(text, 1, 4);
}

}  // namespace

KdxCursor::KdxCursor(std::string_view text) : text_(text) {
  takeText(text_, kByteOrderMark);
}

bool KdxCursor::atLineEndOrComment() const {
  return peek() == '\n' || text_.substr(place_, 2) == "//";
}

std::string_view KdxCursor::restOfLine() const {
  const std::string_view rest = text_.substr(place_, text_.find('\n', place_) - place_);
  return rest.ends_with('\r') ? rest.substr(0, rest.size() - 1) : rest;
}

KdxPosition KdxCursor::position() const {
  return {line_, static_cast<int>(place_ - lineStart_) + 1};
}

std::string KdxCursor::describeNext() const {
  if (atEnd()) return "the end of the file";
  const std::string_view rest = trim(restOfLine());
  return rest.empty() ? "the end of the line" : quotedForMessage(rest);
}

void KdxCursor::skipBlanks() {
  while (!atEnd() && isBlank(text_[place_])) ++place_;
}

void KdxCursor::skipBlanksCommentsAndLineEnds() {
  while (true) {
    skipBlanks();
    if (atEnd() || !atLineEndOrComment()) return;
    const std::size_t end = text_.find('\n', place_);
    if (end == std::string_view::npos) {
      place_ = text_.size();
      return;
    }
    place_ = end + 1;
    lineStart_ = place_;
    ++line_;
  }
}

std::string_view KdxCursor::takeWhile(bool (*belongs)(char)) {
  const std::size_t start = place_;
  while (!atEnd() && belongs(text_[place_])) ++place_;
  return text_.substr(start, place_ - start);
}

std::variant<KdxValue, KdxSyntaxError> readKdxValue(KdxCursor& cursor, char separator) {
  const KdxPosition start = cursor.position();
  if (cursor.atLineEndOrComment()) {
    return KdxSyntaxError{start, fmt::format("expected a value after '{}', found the end of the line", separator)};
  }
  if (cursor.peek() == '\'' || cursor.peek() == '"') return readText(cursor);

  std::string_view item = cursor.restOfLine();
  item = item.substr(0, item.find(','));
  item = trimTrailing(item.substr(0, item.find("//")));
  if (const auto date = parseKdxDate(item)) {
    cursor.advance(item.size());
    return KdxValue{*date, start};
  }
  const std::string_view word = item.substr(0, item.find_first_of(" \t"));
  if (auto number = readNumber(word, start)) {
    cursor.advance(word.size());
    return *std::move(number);
  }
  return KdxSyntaxError{
      start,
      fmt::format("expected a number, a date or a text between quotes, found {}{}", quotedForMessage(item),
                  hasOtherDateForm(item) ? "; a date is written as 2001-01-31" : ""),
      KdxUnquotedText{std::string(item)}};
}

std::optional<DateRecord> parseKdxDate(std::string_view text) {
  text = trim(text);
  std::optional<DateRecord> date = takeDay(text);
  if (!date || text.empty()) return date;
  if (!takeText(text, "T")) {
    if (!isBlank(text.front())) return std::nullopt;
    text = trim(text);
  }
  const auto hour = takeNumber(text, 1, 2);
  if (!hour || !takeText(text, ":")) return std::nullopt;
  const auto minute = takeNumber(text, 2, 2);
  if (!minute) return std::nullopt;
  (*date)[date_field::kHour] = static_cast<std::int32_t>(*hour);
  (*date)[date_field::kMinute] = static_cast<std::int32_t>(*minute);
  if (text.empty()) return date;

  const auto second = takeText(text, ":") ? takeNumber(text, 2, 2) : std::nullopt;
  if (!second || !text.empty()) return std::nullopt;
  (*date)[date_field::kSecond] = static_cast<std::int32_t>(*second);
  return date;
}

}  // namespace mirevo

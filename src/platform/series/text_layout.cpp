#include "platform/series/text_layout.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/number_border.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/series/csv_cells.h"

namespace mirevo {
namespace {

std::string_view viewOf(const char* begin, const char* end) {
  return {begin, static_cast<std::size_t>(end - begin)};
}

/// "Reach 1" is not the beginning of "Reach 10".
bool isOfWord(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_' ||
         static_cast<unsigned char>(c) >= 0x80;
}

void splitAtBlanks(std::string_view line, std::vector<std::string_view>& cells) {
  const char* at = line.data();
  const char* const end = at + line.size();
  while (true) {
    while (at != end && csv::isBlank(*at)) ++at;
    if (at == end) return;
    const char* const begin = at;
    for (bool quoted = false; at != end && (quoted || !csv::isBlank(*at)); ++at) {
      if (*at == '"') quoted = !quoted;
    }
    cells.push_back(csv::cellText(begin, at));
  }
}

}  // namespace

TextLayout::TextLayout(std::string_view content, const TextForm& form)
    : rest_(content), form_(form), left_(form.skipRows), separator_(separatorOf(form)) {
  if (rest_.starts_with(kByteOrderMark)) rest_.remove_prefix(kByteOrderMark.size());
  if (!form.columnWidths.empty()) isUtf8_ = isValidUtf8(content);
  const std::string_view table = trim(form.table);
  if (table.empty()) return;
  state_ = State::before;
  const auto number = parseInteger(table);
  if (number && *number > 0) wanted_ = static_cast<std::size_t>(*number);
}

bool TextLayout::next(Line& line) {
  if (rest_.empty()) return false;
  const char* const begin = rest_.data();
  const char* const end = begin + rest_.size();
  const char* const lineEnd = csv::endOfLine(begin, end);
  rest_ = lineEnd == end ? std::string_view() : viewOf(lineEnd + 1, end);
  line.text = viewOf(begin, csv::trimReturn(begin, lineEnd));
  line.number = ++number_;
  line.kind = kindOf(line.text);
  return true;
}

bool TextLayout::isComment(std::string_view text) const {
  if (!form_.commentSign.empty()) return text.starts_with(form_.commentSign);
  return !hasRows_ && state_ != State::rows && text.starts_with('#');
}

bool TextLayout::beginsTable(std::string_view text) {
  if (wanted_ == 0) {
    const std::string_view title = trim(form_.table);
    if (!text.starts_with(title)) return false;
    if (text.size() > title.size() && isOfWord(title.back()) && isOfWord(text[title.size()])) return false;
    titleLines_.push_back(number_);
    return true;
  }
  const bool begins = !text.empty() && !isInBlock_;
  isInBlock_ = !text.empty();
  if (begins) ++tableCount_;
  return begins && tableCount_ == wanted_;
}

TextLayout::Kind TextLayout::kindOf(std::string_view line) {
  const std::string_view text = trim(line);
  const bool isTitled = state_ == State::before && wanted_ == 0;
  if (!isTitled && state_ != State::skipping && isComment(text)) return Kind::comment;
  if (state_ == State::behind && !form_.table.empty() && wanted_ == 0) beginsTable(text);
  if (state_ == State::behind) return Kind::outside;
  if (state_ == State::before) {
    if (!beginsTable(text)) return Kind::outside;
    state_ = State::skipping;
    if (wanted_ == 0) return Kind::title;
  }
  if (state_ == State::skipping) {
    if (left_ > 0) {
      --left_;
      return Kind::skipped;
    }
    left_ = form_.headerRows;
    state_ = State::header;
    if (isComment(text)) return Kind::comment;
  }
  if (text.empty()) {
    if (state_ == State::rows && hasRows_ && !trim(form_.table).empty()) state_ = State::behind;
    return Kind::blank;
  }
  if (state_ == State::header && left_ > 0) {
    if (--left_ == 0) state_ = State::rows;
    return Kind::header;
  }
  state_ = State::rows;
  hasRows_ = true;
  return Kind::row;
}

bool TextLayout::findSeparator(std::string_view line) {
  bool quoted = false;
  for (const char c : line) {
    if (c == '"') quoted = !quoted;
    if (quoted || form_.decimalSign.front() == c) continue;
    if (c != ',' && c != ';' && c != '\t') continue;
    separator_ = c;
    return true;
  }
  return false;
}

std::size_t TextLayout::widthInBytes(std::string_view line, std::size_t begin, std::size_t characters) const {
  const std::size_t room = line.size() - begin;
  if (!isUtf8_) return std::min(room, characters);
  std::size_t bytes = 0;
  while (bytes < room && (characters > 0 || isInsideCharacter(line[begin + bytes]))) {
    if (!isInsideCharacter(line[begin + bytes])) --characters;
    ++bytes;
  }
  return bytes;
}

bool TextLayout::split(std::string_view line, std::vector<std::string_view>& cells) {
  cells.clear();
  if (!form_.columnWidths.empty()) {
    std::size_t at = 0;
    for (const double width : form_.columnWidths) {
      const std::size_t bytes = widthInBytes(line, at, static_cast<std::size_t>(width));
      cells.push_back(csv::cellText(line.data() + at, line.data() + at + bytes));
      at += bytes;
    }
    return true;
  }
  if (separator_ == '\0' && !findSeparator(line)) return false;
  if (separator_ == ' ') {
    splitAtBlanks(line, cells);
    return true;
  }
  const char* const end = line.data() + line.size();
  for (const char* begin = line.data();; ++begin) {
    const char* const cellEnd = csv::endOfCell(begin, end, separator_);
    cells.push_back(csv::cellText(begin, cellEnd));
    begin = cellEnd;
    if (begin == end) return true;
  }
}

std::string_view TextLayout::behindColumns(std::string_view line) const {
  if (form_.columnWidths.empty()) return {};
  std::size_t at = 0;
  for (const double width : form_.columnWidths) at += widthInBytes(line, at, static_cast<std::size_t>(width));
  return trim(line.substr(at));
}

std::optional<TextLayout::Cut> TextLayout::findCut(std::string_view line, std::size_t first) const {
  std::size_t at = 0;
  std::size_t character = 1;
  for (std::size_t column = 0; column + 1 < form_.columnWidths.size() && at < line.size(); ++column) {
    const auto width = static_cast<std::size_t>(form_.columnWidths[column]);
    at += widthInBytes(line, at, width);
    character += width;
    if (column >= first && isInsideSigned(line, at, form_.decimalSign.front())) return Cut{column, character};
  }
  return std::nullopt;
}

std::string TextLayout::separatorName() const {
  if (!form_.columnWidths.empty()) return "fixed widths";
  if (separator_ == '\0') return {};
  if (separator_ == ' ') return "blanks";
  return separator_ == '\t' ? std::string("tab") : fmt::format("'{}'", separator_);
}

namespace {

constexpr std::size_t kMostCharacters = 100;  ///< of a line that is shown

/// Of a part of a line, as far as there is room for it.
void appendPrintable(std::string_view text, std::string& shown) {
  while (!text.empty() && shown.size() < kMostCharacters) {
    const Utf8Character first = firstCharacter(text);
    const bool isPrintable = first.isValid && first.code >= 0x20 && (first.code < 0x7F || first.code > 0x9F);
    if (isPrintable) shown += text.substr(0, first.bytes);
    for (std::size_t i = 0; !isPrintable && i < first.bytes; ++i) {
      shown += fmt::format("\\x{:02x}", static_cast<unsigned char>(text[i]));
    }
    text.remove_prefix(first.bytes);
  }
  if (!text.empty() && !shown.ends_with("...")) shown += "...";
}

constexpr std::string_view nameOf(TextLayout::Kind kind) {
  switch (kind) {
    case TextLayout::Kind::title:
      return "title of the table";
    case TextLayout::Kind::skipped:
      return "skipped";
    case TextLayout::Kind::comment:
      return "comment";
    case TextLayout::Kind::blank:
      return "blank";
    case TextLayout::Kind::header:
      return "header";
    case TextLayout::Kind::row:
      return "row";
    default:
      return "not in the table";
  }
}

}  // namespace

std::string describeFirstLines(std::string_view content, const TextForm& form) {
  constexpr std::size_t kMostRows = 3;
  constexpr std::size_t kMostOthers = 4;  // in succession
  constexpr std::size_t kMostLines = 100'000;
  TextLayout layout(content, form);
  TextLayout::Line line;
  std::vector<std::string_view> cells;
  std::string lines;
  std::size_t rows = 0;
  std::size_t headers = 0;
  std::size_t others = 0;
  while (rows < kMostRows && line.number < kMostLines && layout.next(line)) {
    const bool isHeader = line.kind == TextLayout::Kind::header;
    const bool isSplit = isHeader || line.kind == TextLayout::Kind::row;
    rows += line.kind == TextLayout::Kind::row ? 1 : 0;
    headers += isHeader ? 1 : 0;
    others = isSplit ? 0 : others + 1;
    if (others > kMostOthers || (isHeader && headers > kMostOthers)) {
      if (others == kMostOthers + 1) lines += "\n  ...";
      continue;
    }
    std::string shown;
    if (isSplit && layout.split(line.text, cells)) {
      for (std::size_t i = 0; i < cells.size() && shown.size() < kMostCharacters; ++i) {
        if (i > 0) shown += " | ";
        appendPrintable(cells[i], shown);
      }
    } else {
      appendPrintable(trim(line.text), shown);
    }
    lines += fmt::format("\n  {} {}{}{}", line.number, nameOf(line.kind), shown.empty() ? "" : ": ", shown);
  }
  if (lines.empty()) return {};
  const std::string separator = layout.separatorName();
  const std::string columns = separator.empty()            ? ""
                              : !form.columnWidths.empty() ? ", with columns of fixed widths"
                                                           : ", with columns separated by " + separator;
  return fmt::format("\nthe first lines as they were understood{}:{}", columns, lines);
}

}  // namespace mirevo

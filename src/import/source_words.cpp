#include "import/source_words.h"

#include <algorithm>

#include "common/text.h"

namespace mirevo {

std::vector<std::string> wordsOf(std::string_view line) {
  constexpr std::string_view kBlanks = " \t\r";
  std::vector<std::string> words;
  for (std::size_t at = line.find_first_not_of(kBlanks); at < line.size(); at = line.find_first_not_of(kBlanks, at)) {
    const char quote = line[at];
    const std::size_t close = quote == '"' || quote == '\'' ? line.find(quote, at + 1) : std::string_view::npos;
    if (close != std::string_view::npos) {
      words.emplace_back(line.substr(at + 1, close - at - 1));
      at = close + 1;
      continue;
    }
    const std::size_t end = std::min(line.find_first_of(kBlanks, at), line.size());
    words.emplace_back(line.substr(at, end - at));
    at = end;
  }
  return words;
}

std::vector<std::string> cellsOf(std::string_view line, char separator) {
  if (separator == ' ') return wordsOf(line);
  std::vector<std::string> cells(1);
  bool isQuoted = false;
  for (const char c : trimTrailing(line)) {
    if (c == '"') {
      isQuoted = !isQuoted;
    } else if (c == separator && !isQuoted) {
      cells.emplace_back();
    } else {
      cells.back() += c;
    }
  }
  for (std::string& cell : cells) cell = std::string(trim(cell));
  return cells;
}

}  // namespace mirevo

#include "platform/processes/argument_text.h"

#include <fmt/core.h>

namespace mirevo {
namespace {

bool isProtectedInQuotes(char c) {
  return c == '"' || c == '\\' || c == '$' || c == '`';
}

}  // namespace

std::optional<std::vector<std::string>> splitArguments(std::string_view text, std::string& reason) {
  std::vector<std::string> words;
  std::string word;
  bool inWord = false;  // distinguishes an empty quoted word from no word
  char quote = '\0';
  std::size_t quotePosition = 0;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    const bool hasNext = i + 1 < text.size();
    if (quote != '\0') {
      if (c == quote) {
        quote = '\0';
      } else if (quote == '"' && c == '\\' && hasNext && isProtectedInQuotes(text[i + 1])) {
        word += text[++i];
      } else {
        word += c;
      }
    } else if (c == '\'' || c == '"') {
      quote = c;
      quotePosition = i;
      inWord = true;
    } else if (c == '\\') {
      if (!hasNext) {
        reason = "expected a character after the backslash at the end";
        return std::nullopt;
      }
      word += text[++i];
      inWord = true;
    } else if (c == ' ' || c == '\t' || c == '\r' || c == '\n') {
      if (inWord) words.push_back(std::move(word));
      word.clear();
      inWord = false;
    } else {
      word += c;
      inWord = true;
    }
  }
  if (quote != '\0') {
    reason = fmt::format("expected a closing {} for the one at character {}", quote, quotePosition + 1);
    return std::nullopt;
  }
  if (inWord) words.push_back(std::move(word));
  return words;
}

}  // namespace mirevo

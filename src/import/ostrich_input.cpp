#include "import/ostrich_input.h"

#include <algorithm>

#include <fmt/format.h>

#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "import/source_words.h"

namespace mirevo {
namespace {

constexpr std::string_view kBegin = "begin";
constexpr std::string_view kEnd = "end";

/// A line without its comment: what follows a # at its beginning or behind a blank, outside of quotes.
std::string_view withoutComment(std::string_view line) {
  char quote = '\0';
  for (std::size_t i = 0; i < line.size(); ++i) {
    const char c = line[i];
    if (quote != '\0') {
      if (c == quote) quote = '\0';
    } else if (c == '\'' || c == '"') {
      if (line.find(c, i + 1) != std::string_view::npos) quote = c;
    } else if (c == '#' && (i == 0 || line[i - 1] == ' ' || line[i - 1] == '\t')) {
      return line.substr(0, i);
    }
  }
  return line;
}

bool beginsWith(std::string_view word, std::string_view start) {
  return word.size() > start.size() && equalIgnoringCase(word.substr(0, start.size()), start);
}

}  // namespace

OstrichInput parseOstrichInput(const std::string& sourceName, std::string_view text) {
  takeText(text, kByteOrderMark);
  OstrichInput input;
  OstrichBlock* open = nullptr;
  SourcePlace place{sourceName, 0};
  for (const std::string_view whole : splitLines(text)) {
    ++place.line;
    const std::string_view line = trim(withoutComment(whole));
    if (line.empty()) continue;
    const std::vector<std::string> words = wordsOf(line);
    const std::string& first = words.front();
    if (words.size() == 1 && beginsWith(first, kBegin)) {
      if (open != nullptr) {
        failImport(place, fmt::format("expected End{} of the block that begins in line {}, found {}", open->name,
                                      open->place.line, first));
      }
      open = &input.blocks.emplace_back(OstrichBlock{place, first.substr(kBegin.size()), {}});
    } else if (words.size() == 1 && beginsWith(first, kEnd)) {
      if (open == nullptr || !equalIgnoringCase(first.substr(kEnd.size()), open->name)) {
        failImport(place, open == nullptr ? fmt::format("expected no end of a block here, found {}", first)
                                          : fmt::format("expected End{}, found {}", open->name, first));
      }
      open = nullptr;
    } else {
      (open != nullptr ? open->lines : input.settings).push_back({place, words, std::string(line)});
    }
  }
  if (open != nullptr)
    failImport(open->place, fmt::format("expected End{} behind it, found the end of the file", open->name));
  return input;
}

const OstrichLine* OstrichInput::setting(std::string_view keyword) const {
  const auto isIt = [keyword](const OstrichLine& line) { return equalIgnoringCase(line.words.front(), keyword); };
  const auto found = std::find_if(settings.rbegin(), settings.rend(), isIt);
  return found == settings.rend() ? nullptr : &*found;
}

const OstrichBlock* OstrichInput::block(std::string_view name) const {
  const auto isIt = [name](const OstrichBlock& block) { return equalIgnoringCase(block.name, name); };
  const auto found = std::find_if(blocks.begin(), blocks.end(), isIt);
  return found == blocks.end() ? nullptr : &*found;
}

}  // namespace mirevo

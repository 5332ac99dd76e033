#include "run/setup/setup_reference.h"

#include <algorithm>

#include <fmt/core.h>

#include "run/setup/run_keywords.h"

namespace mirevo {
namespace {

constexpr std::string_view kIntroduction = R"(# Setup reference

Every section and keyword of a setup file, in the order in which they are read. This page is made from the program's
keyword rows; do not edit it.

- The sections are inside `[{}]`. `a/b` is section `b` inside section `a`. In the name of an item section `n` is the item's
  number, counting from 1 without padding; `{}` says how many there are.
- A keyword without a default is required, and so is a section that is read, unless its heading says otherwise. A section
  that the run does not need may be left out.
- Types: *integer* (32 bits), *real* (an integer is accepted), *text* and *file* (between quotes, at most {} bytes), *name*
  (a text that is not blank), *free text* (of any length), *list* (reals with commas between them), *date*, *code*, *item*. See
  [file formats](file-formats.md) for how they are written. A file's name is relative to the setup file's folder, or
  absolute.
- A *code* is one of a few values, given by its number or by its name between quotes, in upper or lower case:
  `Algorithm_Type = 2` and `Algorithm_Type = 'DDS'` are the same. The names follow the keywords of their section; what has
  no number there has a name only. Where a code means no or yes, the names are `'no'` and `'yes'`;
  of another number the lowest bit counts, with a warning, unless the keyword says otherwise.
- An *item* is one of a list of the setup, given by its number, counting from 1, or by its name between quotes.
- Unknown sections and keywords are not read; the run log warns of them and names the nearest known one.
)";

std::string defaultText(const KeywordRow& row) {
  if (row.isRequired()) return "required";
  return row.isLeftOutByDefault() || row.type == KeywordType::textLines ? "none"
                                                                        : fmt::format("`{}`", row.facts.defaultValue);
}

std::string codesText(const KeywordRow& row) {
  std::string text;
  for (const CodeName& code : row.facts.codes) {
    if (!text.empty()) text += ", ";
    text += code.code ? fmt::format("{} `'{}'`", *code.code, code.name) : fmt::format("`'{}'`", code.name);
  }
  return text;
}

std::string keywordTableOf(const SectionRow& section) {
  std::string text = "| keyword | type | default | valid | unit | meaning |\n|---|---|---|---|---|---|\n";
  std::string codes;
  for (const KeywordRow& row : section.keywords) {
    text += fmt::format("| `{}` | {} | {} | {} | {} | {} |\n", row.name(), keywordTypeName(row.type), defaultText(row),
                        validText(row), row.facts.unit, row.facts.meaning);
    const bool isFlag = row.facts.codes.data() == std::data(kNoYesNames);
    if (!row.facts.codes.empty() && !isFlag) codes += fmt::format("- `{}`: {}\n", row.name(), codesText(row));
  }
  return codes.empty() ? text : text + "\n" + codes;
}

}  // namespace

std::string validText(const KeywordRow& row) {
  const std::string text = row.facts.range.text();
  const auto hasNameOnly = [](const CodeName& code) { return !code.code.has_value(); };
  const bool mayBeName = row.type == KeywordType::item || std::ranges::any_of(row.facts.codes, hasNameOnly);
  return text.empty() || !mayBeName ? text : text + " or a name";
}

std::string_view keywordTypeName(KeywordType type) {
  switch (type) {
    case KeywordType::integer:
      return "integer";
    case KeywordType::code:
      return "code";
    case KeywordType::item:
      return "item";
    case KeywordType::real:
      return "real";
    case KeywordType::name:
      return "name";
    case KeywordType::text:
      return "text";
    case KeywordType::freeText:
    case KeywordType::textLines:
      return "free text";
    case KeywordType::fileName:
      return "file";
    case KeywordType::realList:
      return "list";
    case KeywordType::date:
      return "date";
  }
  return "";
}

std::string setupReference() {
  std::string page = fmt::format(kIntroduction, kSetupTarget, kItemCountKeyword, kFieldWidth);
  for (const SectionRow* section : setupSchema().sections()) {
    page += fmt::format("\n## {}\n\nRead {}. {}\n", section->path, section->readWhen, section->meaning);
    if (!section->keywords.empty()) page.append("\n").append(keywordTableOf(*section));
  }
  return page;
}

}  // namespace mirevo

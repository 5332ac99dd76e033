#include "run/setup/setup_reference.h"

#include <fmt/core.h>

#include "run/setup/keyword_table.h"

namespace mirevo {
namespace {

constexpr std::string_view kIntroduction = R"(# Setup reference

Every section and keyword of a setup file, in the order in which they are read. This page is made from the program's
keyword table; do not edit it.

- The sections stand inside `[{}]`. `a/b` is section `b` inside section `a`. In the name of an item section `n` is the
  item's number, counting from 1 without padding; `{}` says how many there are.
- A keyword without a default is required, and so is a section that is read, unless its heading says otherwise. A section that the run does
  not need may be left out.
- Types: *integer* (32 bits), *real* (an integer will do), *text* and *file* (between quotes, at most {} bytes), *name* (a text that is not
  blank), *free text* (of any length), *list* (reals with commas between them), *date*. See [file formats](file-formats.md)
  for how they are written. A file's name is relative to the setup file's folder, or absolute.
- Unknown sections and keywords are not read; the run log warns of them and names the nearest known one.
)";

std::string_view typeName(KeywordType type) {
  switch (type) {
    case KeywordType::integer:
      return "integer";
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

std::string defaultText(const KeywordRow& row) {
  if (row.isRequired()) return "required";
  return row.isLeftOutByDefault() || row.type == KeywordType::textLines ? "none"
                                                                        : fmt::format("`{}`", row.defaultValue);
}

std::string keywordTableOf(std::string_view section) {
  std::string text = "| keyword | type | default | valid | unit | meaning |\n|---|---|---|---|---|---|\n";
  for (const KeywordRow& row : keywordsOf(section)) {
    text += fmt::format("| `{}` | {} | {} | {} | {} | {} |\n", row.name, typeName(row.type), defaultText(row),
                        row.range.text(), row.unit, row.meaning);
  }
  return text;
}

}  // namespace

std::string setupReference() {
  std::string page = fmt::format(kIntroduction, kSetupTarget, kItemCountKeyword, kFieldWidth);
  for (const SectionRow& section : sectionTable()) {
    page += fmt::format("\n## {}\n\nRead {}. {}\n", section.path, section.readWhen, section.meaning);
    if (!keywordsOf(section.path).empty()) page.append("\n").append(keywordTableOf(section.path));
  }
  return page;
}

}  // namespace mirevo

#include "run/setup/keyword_help.h"

#include <algorithm>
#include <map>

#include <fmt/core.h>

#include "common/text.h"
#include "run/setup/run_keywords.h"
#include "run/setup/setup_reference.h"

namespace mirevo {
namespace {

constexpr std::size_t kTextColumns = 78;
constexpr std::size_t kMostNames = 4;

/// Lower case, with `n` for the numbers of items.
std::string comparable(std::string_view name) {
  std::string text;
  for (const std::string_view part : splitAt(name, '/')) {
    text.append(text.empty() ? "" : "/").append(toLowerAscii(itemPattern(part)));
  }
  return text;
}

/// Whether `path` is the name, or ends with it behind a slash.
bool isNamed(std::string_view path, const std::string& name) {
  const std::string whole = comparable(path);
  return whole == name || whole.ends_with("/" + name);
}

std::string withoutUnderscores(std::string_view name) {
  std::string text = toLowerAscii(name);
  std::erase(text, '_');
  return text;
}

std::string pathOf(const SectionRow& section, const KeywordRow& row) {
  return fmt::format("{}/{}", section.path, row.name());
}

/// Links of the reference page become their text, with the page behind it.
std::string withoutLinks(std::string_view markdown) {
  std::string text;
  while (!markdown.empty()) {
    const std::size_t start = markdown.find('[');
    const std::size_t middle = markdown.find("](", start);
    const std::size_t end = markdown.find(')', middle);
    if (end == std::string_view::npos) break;
    text.append(markdown.substr(0, start)).append(markdown.substr(start + 1, middle - start - 1));
    text.append(" (docs/").append(markdown.substr(middle + 2, end - middle - 1));
    markdown.remove_prefix(end + 1);
  }
  return text.append(markdown);
}

/// The words of `text` in lines of at most kTextColumns, all but the first indented.
std::string wrapped(std::string_view first, std::string_view text) {
  constexpr std::string_view kIndentation = "    ";
  std::string lines(first);
  std::size_t column = lines.size();
  for (const std::string_view word : splitAt(text, ' ')) {
    if (word.empty()) continue;
    if (column + 1 + word.size() > kTextColumns && column > kIndentation.size()) {
      lines.append("\n").append(kIndentation);
      column = kIndentation.size();
    } else if (column > 0 && lines.back() != ' ') {
      lines += ' ';
      ++column;
    }
    lines += word;
    column += word.size();
  }
  return lines + "\n";
}

std::string helpOfSection(const SectionRow& section) {
  return wrapped("  Section:",
                 fmt::format("read {}. {}", withoutLinks(section.readWhen), withoutLinks(section.meaning)));
}

std::string helpOfKeyword(const SectionRow& section, const KeywordRow& row) {
  std::string text = pathOf(section, row) + "\n" + wrapped("  Meaning:", withoutLinks(row.facts.meaning));
  text += wrapped("  Type:", keywordTypeName(row.type));
  text += wrapped("  Default:", row.isRequired() ? "required" : row.facts.defaultValue);
  if (const std::string range = validText(row); !range.empty()) text += wrapped("  Valid:", range);
  if (!row.facts.unit.empty()) text += wrapped("  Unit:", row.facts.unit);
  if (!row.facts.codes.empty()) {
    std::string codes;
    for (const CodeName& code : row.facts.codes) {
      codes.append(codes.empty() ? "" : ", ");
      codes += code.code ? fmt::format("{} '{}'", *code.code, code.name) : fmt::format("'{}'", code.name);
    }
    text += wrapped("  Values:", codes);
  }
  return text + helpOfSection(section);
}

}  // namespace

std::vector<std::string> keywordNames() {
  std::vector<std::string> names;
  for (const SectionRow* section : setupSchema().sections()) {
    for (const KeywordRow& row : section->keywords) names.push_back(pathOf(*section, row));
  }
  return names;
}

std::string keywordHelp(std::string_view name) {
  const std::string wanted = comparable(trim(name));
  std::string ofKeywords;
  std::string ofSections;
  for (const SectionRow* section : setupSchema().sections()) {
    for (const KeywordRow& row : section->keywords) {
      if (isNamed(pathOf(*section, row), wanted)) ofKeywords += "\n" + helpOfKeyword(*section, row);
    }
    if (!isNamed(section->path, wanted)) continue;
    ofSections += fmt::format("\n{}\n{}", section->path, helpOfSection(*section));
    for (const KeywordRow& row : section->keywords) ofSections += fmt::format("    {}\n", pathOf(*section, row));
  }
  const std::string& found = ofKeywords.empty() ? ofSections : ofKeywords;
  return found.empty() ? found : found.substr(1);  // without the empty line before the first
}

std::vector<std::string> namesLike(std::string_view name) {
  name = trim(name);
  const std::string_view last = name.substr(name.rfind('/') + 1);  // its section may be the wrong one
  const std::string wanted = withoutUnderscores(last);
  std::vector<std::string> known;
  std::multimap<std::size_t, std::string> found;  // by how much else they contain, more where it comes before
  const auto consider = [&](std::string_view candidate, const std::string& path) {
    known.emplace_back(candidate);
    const std::string compared = withoutUnderscores(candidate);
    const std::size_t at = wanted.empty() ? std::string::npos : compared.find(wanted);
    if (at != std::string::npos) found.emplace(compared.size() - wanted.size() + at, path);
  };
  for (const SectionRow* section : setupSchema().sections()) {
    consider(section->path.substr(section->path.rfind('/') + 1), std::string(section->path));
    for (const KeywordRow& row : section->keywords) consider(row.name(), pathOf(*section, row));
  }
  std::vector<std::string> like;
  for (const auto& [rest, path] : found) {
    if (like.size() < kMostNames) like.push_back(path);
  }
  if (like.empty()) {
    if (const auto nearest = nearestName(last, known)) like.push_back(*nearest);
  }
  return like;
}

}  // namespace mirevo

#include "run/access/setup_schema.h"

#include <utility>

namespace mirevo {

SetupSchema::SetupSchema(std::vector<const SectionRow*> sections) : sections_(std::move(sections)) {
  for (const SectionRow* section : sections_) byPath_.emplace(section->path, section);
}

const SectionRow* SetupSchema::findSection(std::string_view path) const {
  const auto found = byPath_.find(path);
  return found == byPath_.end() ? nullptr : found->second;
}

const KeywordRow* SetupSchema::findKeyword(std::string_view section, std::string_view name) const {
  const SectionRow* row = findSection(section);
  if (row == nullptr) return nullptr;
  for (const KeywordRow& keyword : row->keywords) {
    if (keyword.name() == name) return &keyword;
  }
  return nullptr;
}

std::vector<std::string> SetupSchema::sectionNamesInside(std::string_view path) const {
  std::vector<std::string> names;
  for (const SectionRow* row : sections_) {
    const auto slash = row->path.rfind('/');
    const bool isTop = slash == std::string_view::npos;
    if ((isTop ? std::string_view{} : row->path.substr(0, slash)) == path) {
      names.emplace_back(isTop ? row->path : row->path.substr(slash + 1));
    }
  }
  return names;
}

std::vector<std::string> SetupSchema::sectionsWith(std::string_view keyword) const {
  std::vector<std::string> paths;
  for (const SectionRow* row : sections_) {
    if (findKeyword(row->path, keyword) != nullptr) paths.emplace_back(row->path);
  }
  return paths;
}

std::vector<std::string> SetupSchema::sectionsThatHold(std::string_view section) const {
  std::vector<std::string> paths;
  for (const SectionRow* row : sections_) {
    const auto slash = row->path.rfind('/');
    const bool isTop = slash == std::string_view::npos;
    if ((isTop ? row->path : row->path.substr(slash + 1)) != section) continue;
    paths.emplace_back(isTop ? kSetupTarget : row->path.substr(0, slash));
  }
  return paths;
}

std::string itemPattern(std::string_view name) {
  const auto underscore = name.rfind('_');
  if (underscore == std::string_view::npos) return std::string(name);
  const std::string_view number = name.substr(underscore + 1);
  const bool isNumber =
      !number.empty() && number.front() != '0' && number.find_first_not_of("0123456789") == std::string_view::npos;
  return std::string(isNumber ? name.substr(0, underscore + 1) : name) + (isNumber ? "n" : "");
}

}  // namespace mirevo

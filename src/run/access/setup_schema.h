#pragma once

#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// The target of a setup file.
inline constexpr std::string_view kSetupTarget = "MIREVO_PARAMETERS";

/// Every section that a setup may have, with its keywords, in reading order. The rows must outlive the schema.
class SetupSchema final {
 public:
  explicit SetupSchema(std::vector<const SectionRow*> sections);

  const std::vector<const SectionRow*>& sections() const { return sections_; }
  /// The section with this path, with item numbers as `n`; nullptr for an unknown path.
  const SectionRow* findSection(std::string_view path) const;
  /// The row of a keyword; nullptr if the section has no such keyword.
  const KeywordRow* findKeyword(std::string_view section, std::string_view name) const;
  /// The names of the sections directly inside `path` (empty: of the target), item numbers as `n`.
  std::vector<std::string> sectionNamesInside(std::string_view path) const;
  /// The paths of the sections that have a keyword of this name.
  std::vector<std::string> sectionsWith(std::string_view keyword) const;
  /// The paths of those directly inside which is a section of this name, with its item number as `n`; that of the
  /// target is its name.
  std::vector<std::string> sectionsThatHold(std::string_view section) const;

 private:
  std::vector<const SectionRow*> sections_;
  std::unordered_map<std::string_view, const SectionRow*> byPath_;
};

/// The name of an item section with `n` for its number, `PARAMETER_n` for `PARAMETER_12`; other names unchanged.
std::string itemPattern(std::string_view name);

}  // namespace mirevo

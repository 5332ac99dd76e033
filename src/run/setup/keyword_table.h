#pragma once

#include <cstdint>
#include <limits>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "common/date_record.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The target of a setup file.
inline constexpr std::string_view kSetupTarget = "MIREVO_PARAMETERS";
/// The count that every list section states.
inline constexpr std::string_view kItemCountKeyword = "TqSEKdxListItemCount";
/// Names, titles and file names are fields of this many bytes.
inline constexpr std::size_t kFieldWidth = 255;

enum class KeywordType {
  integer,
  real,
  name,       ///< text of at most kFieldWidth bytes, neither blank nor with tabs
  text,       ///< text of at most kFieldWidth bytes
  freeText,   ///< text of any length
  textLines,  ///< a keyword that may be repeated, a text each
  fileName,   ///< text of at most kFieldWidth bytes, made absolute; blank stays blank
  realList,
  date
};

using SetupValue = std::variant<std::int32_t, double, std::string, std::vector<double>, DateRecord>;

/// Valid numbers of a keyword. NaN and infinity are never valid.
struct ValueRange {
  double lowest = -std::numeric_limits<double>::infinity();
  double highest = std::numeric_limits<double>::infinity();
  bool lowestExcluded = false;

  bool contains(double value) const;
  /// "1 or more", "greater than 0", "0 to 3"; empty when everything is valid.
  std::string text() const;
};

/// Default of an optional keyword without a value of its own.
inline constexpr std::string_view kNoDefault = "none";

/// One keyword of the setup file: all that reading it, echoing it, checking it and the manual need to know.
struct KeywordRow {
  /// Names of the sections below the target, `/` between them; an item section's number is written `n`.
  std::string_view section;
  std::string_view name;
  KeywordType type = KeywordType::integer;
  /// As a setup would have it; empty where the keyword is required.
  std::string_view defaultValue;
  ValueRange range;
  std::string_view unit;
  std::string_view meaning;
  /// Puts the value into its field; `item` is the 0-based number of the item section that was read. Null for list
  /// counts and for what is known and not used.
  void (*store)(RunConfig& config, std::size_t item, const SetupValue& value) = nullptr;
  /// Whether another value may give other results: a run is then not taken up again with it.
  bool bearsOnResults = true;

  bool isRequired() const { return defaultValue.empty(); }
  bool isLeftOutByDefault() const { return defaultValue == kNoDefault; }
};

/// One section of the setup file.
struct SectionRow {
  std::string_view path;      ///< as KeywordRow::section
  std::string_view readWhen;  ///< "always", or when
  std::string_view meaning;
};

/// Every section in reading order.
std::span<const SectionRow> sectionTable();

/// Every keyword, those of a section side by side in reading order.
std::span<const KeywordRow> keywordTable();

/// The keywords of a section path; empty for a section without any.
std::span<const KeywordRow> keywordsOf(std::string_view section);

/// nullptr for a path that the setup does not know.
const SectionRow* findSection(std::string_view path);

/// nullptr for a keyword that the section does not know.
const KeywordRow* findKeyword(std::string_view section, std::string_view name);

/// The names of the sections directly inside `path` (empty: of the target), item numbers as `n`.
std::vector<std::string> sectionNamesInside(std::string_view path);

/// The name of an item section without its number, `PARAMETER_n` for `PARAMETER_12`; other names as they are.
std::string itemPattern(std::string_view name);

}  // namespace mirevo

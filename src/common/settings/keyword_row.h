#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "common/date_record.h"
#include "common/settings/code_name.h"

namespace mirevo {

/// The count that every list section states.
inline constexpr std::string_view kItemCountKeyword = "TqSEKdxListItemCount";
/// Names, titles and file names are fields of this many bytes.
inline constexpr std::size_t kFieldWidth = 255;

enum class KeywordType {
  integer,
  real,
  code,       ///< one of a few values, by its number or by its name between quotes
  item,       ///< one of the items of a list of the setup, by its number or by its name between quotes
  name,       ///< text of at most kFieldWidth bytes that is not blank and has no tabs
  text,       ///< text of at most kFieldWidth bytes
  freeText,   ///< text of any length
  textLines,  ///< a keyword that may be repeated, with one text each time
  fileName,   ///< text of at most kFieldWidth bytes, made absolute; blank stays blank
  realList,
  date
};

/// A value as read from the setup. That of a coded keyword is its number, or its name if it has no number; that of an
/// item is what was written.
using SetupValue = std::variant<std::int32_t, double, std::string, std::vector<double>, DateRecord>;

/// Valid numbers of a keyword. NaN and infinity are never valid.
struct ValueRange {
  double lowest = -std::numeric_limits<double>::infinity();
  double highest = std::numeric_limits<double>::infinity();
  bool lowestExcluded = false;

  bool contains(double value) const;
  /// "1 or more", "greater than 0", "0 to 3"; empty when every number is valid.
  std::string text() const;
};

inline constexpr ValueRange kAnyValue{};
inline constexpr ValueRange kNonNegative{.lowest = 0};
inline constexpr ValueRange kPositive{.lowest = 0, .lowestExcluded = true};
inline constexpr ValueRange kFraction{.lowest = 0, .highest = 1};
constexpr ValueRange from(double lowest) {
  return {.lowest = lowest};
}
constexpr ValueRange between(double lowest, double highest) {
  return {.lowest = lowest, .highest = highest};
}

/// The default of an optional keyword that has no default value.
inline constexpr std::string_view kNoDefault = "none";

/// KeywordFacts::bearsOnResults of settings that do not affect the results.
inline constexpr bool kNotOfResults = false;

/// The codes of settings that mean no or yes.
inline constexpr CodeName kNoYesNames[] = {{0, "no"}, {1, "yes"}};

/// Why a value within the keyword's range is refused.
struct SettingRefusal {
  std::string message;       ///< the fixed text
  std::string_view keyword;  ///< the keyword whose value is refused
  std::string explanation;   ///< what was expected and found
};

/// What a row says about its keyword, apart from the field that takes the value.
struct KeywordFacts {
  std::string_view name;
  std::optional<KeywordType> type = {};  ///< the type of the field, unless given
  std::string_view defaultValue = {};    ///< as written in a setup; empty if the keyword is required
  ValueRange range = {};
  std::span<const CodeName> codes = {};  ///< of a coded keyword
  /// For a value outside the range, with the item's name behind a final blank; without it the check judges, if any.
  std::string_view refusal = {};
  std::string_view unit = {};
  std::string meaning = {};
  bool isOfNewSection =
      false;                   ///< it is optional, but in the lines of a section to be added, which needs it or another
  bool bearsOnResults = true;  ///< another value may change the results: a restart with one is refused
  int checkOrder = 0;          ///< values are checked in ascending order of this number, equal ones in reading order
};

/// One keyword of a section: all that is needed to read, check, echo and document it.
struct KeywordRow {
  KeywordFacts facts;
  KeywordType type = KeywordType::integer;
  /// Puts the value into its field of the section's settings. Null for list counts and for keywords that are known but
  /// not used.
  void (*store)(void* settings, const SetupValue& value) = nullptr;
  /// Checks the value against the others of its section; called if it is within its own range.
  std::optional<SettingRefusal> (*check)(const void* settings) = nullptr;
  bool isYesOrNo = false;  ///< any number is valid, of which the lowest bit counts

  std::string_view name() const { return facts.name; }
  bool isRequired() const { return facts.defaultValue.empty(); }
  bool isLeftOutByDefault() const { return facts.defaultValue == kNoDefault; }
};

/// One section of the setup file.
struct SectionRow {
  /// Names of the sections below the target, separated by `/`; the number of an item section is written `n`.
  std::string_view path;
  std::string_view readWhen;  ///< "always", or a condition
  std::string_view meaning;
  std::vector<KeywordRow> keywords = {};
  /// The name of the item that the settings belong to, for refusals; null: the section's own name.
  std::string (*itemName)(const void* settings) = nullptr;
};

/// A section whose keywords fill a `Settings`.
template <class Settings>
struct SettingSection {
  SectionRow row;
};

/// The keywords of a section together with the settings that they fill.
struct BoundSection {
  const SectionRow* row = nullptr;
  void* settings = nullptr;

  BoundSection() = default;
  template <class Settings>
  BoundSection(const SettingSection<Settings>& section, Settings& filled)
      : row(&section.row), settings(static_cast<void*>(&filled)) {}
};

namespace settings_detail {

template <class Field>
constexpr KeywordType typeOf() {
  if constexpr (std::is_enum_v<Field>) return KeywordType::code;
  if constexpr (std::is_same_v<Field, double> || std::is_same_v<Field, std::optional<double>>) return KeywordType::real;
  if constexpr (std::is_same_v<Field, std::string>) return KeywordType::text;
  if constexpr (std::is_same_v<Field, std::vector<std::string>>) return KeywordType::textLines;
  if constexpr (std::is_same_v<Field, std::vector<double>>) return KeywordType::realList;
  if constexpr (std::is_same_v<Field, DateRecord> || std::is_same_v<Field, std::optional<DateRecord>>) {
    return KeywordType::date;
  }
  return KeywordType::integer;
}

/// Puts a value into a field, by the field's own type.
template <class Field>
void assign(Field& field, const SetupValue& value) {
  if constexpr (std::is_enum_v<Field>) {
    field = static_cast<Field>(std::get<std::int32_t>(value));
  } else if constexpr (std::is_same_v<Field, bool>) {
    field = (std::get<std::int32_t>(value) & 1) != 0;  // the lowest bit: -1 means yes, too
  } else if constexpr (std::is_same_v<Field, std::optional<double>>) {
    field = std::get<double>(value);
  } else if constexpr (std::is_same_v<Field, std::optional<DateRecord>>) {
    field = std::get<DateRecord>(value);
  } else if constexpr (std::is_same_v<Field, std::vector<std::string>>) {
    field.push_back(std::get<std::string>(value));
  } else {
    field = std::get<Field>(value);
  }
}

}  // namespace settings_detail

/// A row whose value goes into the field that `fieldOf(settings)` returns; `fieldOf` is a lambda without captures.
template <class Settings, class FieldOf>
KeywordRow setting(FieldOf, KeywordFacts facts) {
  using Field = std::remove_reference_t<decltype(std::declval<FieldOf>()(std::declval<Settings&>()))>;
  const KeywordType type = facts.type.value_or(
      std::is_same_v<Field, bool> || !facts.codes.empty() ? KeywordType::code : settings_detail::typeOf<Field>());
  if (std::is_same_v<Field, bool> && facts.codes.empty()) facts.codes = kNoYesNames;
  return {.facts = std::move(facts),
          .type = type,
          .store =
              [](void* settings, const SetupValue& value) {
                settings_detail::assign(FieldOf{}(*static_cast<Settings*>(settings)), value);
              },
          .isYesOrNo = std::is_same_v<Field, bool>};
}

/// The same for a field named by its member pointer: `setting<&SceSettings::complexCount>({...})`.
template <auto Member, class Settings, class Field>
KeywordRow memberSetting(Field Settings::*, KeywordFacts facts) {
  return setting<Settings>(
      [](Settings & settings) -> auto& { return settings.*Member; }, std::move(facts));
}
template <auto Member>
KeywordRow setting(KeywordFacts facts) {
  return memberSetting<Member>(Member, std::move(facts));
}

/// A row of a code or an item whose value is passed on as it was read, a number or a name: `take(settings, value)`.
template <class Settings, class Take>
KeywordRow choice(Take, KeywordFacts facts) {
  const KeywordType type = facts.type.value_or(KeywordType::code);
  return {std::move(facts), type,
          [](void* settings, const SetupValue& value) { Take{}(*static_cast<Settings*>(settings), value); }};
}

/// The row with a check of its value against others; `check(settings)` is a function or lambda without captures that
/// returns the refusal, if any.
template <class Settings, class Check>
KeywordRow checked(KeywordRow row, Check) {
  row.check = [](const void* settings) -> std::optional<SettingRefusal> {
    return Check{}(*static_cast<const Settings*>(settings));
  };
  return row;
}

/// A SectionRow::itemName that returns `nameOf(settings)`; `nameOf` is a lambda without captures.
template <class Settings, class NameOf>
auto itemName(NameOf) {
  return [](const void* settings) -> std::string { return NameOf{}(*static_cast<const Settings*>(settings)); };
}

/// The count of a list; required for one that needs an item.
KeywordRow itemCount(int least = 0);
/// A row for a keyword that is known but not used.
KeywordRow unused(KeywordFacts facts, KeywordType type);

/// The name of a coded value; empty if it has none.
std::string_view nameOfCode(std::span<const CodeName> codes, const SetupValue& value);

/// Whether a coded value, a number or a name as SetupValue has it, is the one meant here.
bool isCode(const CodeName& meant, const SetupValue& value);

}  // namespace mirevo

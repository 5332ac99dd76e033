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
  name,       ///< text of at most kFieldWidth bytes, neither blank nor with tabs
  text,       ///< text of at most kFieldWidth bytes
  freeText,   ///< text of any length
  textLines,  ///< a keyword that may be repeated, one text each
  fileName,   ///< text of at most kFieldWidth bytes, made absolute; blank stays blank
  realList,
  date
};

/// A value as the setup has it. That of a coded keyword is its number, or its name where it has none.
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

/// Default of an optional keyword without a value of its own.
inline constexpr std::string_view kNoDefault = "none";

/// KeywordFacts::bearsOnResults of settings that bear on no result.
inline constexpr bool kNotOfResults = false;

/// Names of settings that are a yes or a no.
inline constexpr CodeName kNoYesNames[] = {{0, "no"}, {1, "yes"}};

/// Why a value cannot stay, though the keyword's range holds it.
struct SettingRefusal {
  std::string message;       ///< the fixed text
  std::string_view keyword;  ///< whose value it is
  std::string explanation;   ///< what was expected and found
};

/// What a row says about its keyword, apart from the field that takes the value.
struct KeywordFacts {
  std::string_view name;
  std::optional<KeywordType> type = {};  ///< that of the field, unless given
  std::string_view defaultValue = {};    ///< as a setup would have it; empty where the keyword is required
  ValueRange range = {};
  std::span<const CodeName> codes = {};  ///< of a coded keyword
  /// Fixed text for a value outside the range; a blank at its end stands before the name of the item.
  std::string_view refusal = {};
  std::string_view unit = {};
  std::string meaning = {};
  bool bearsOnResults = true;  ///< another value may give other results: no run is continued with it
  int checkOrder = 0;          ///< values are checked in this order, those of the same order as they are read
};

/// One keyword of a section: all that reading it, echoing it, checking it and the manual need to know.
struct KeywordRow {
  KeywordFacts facts;
  KeywordType type = KeywordType::integer;
  /// Puts the value into its field of the section's settings. Null for list counts and for what is known and not used.
  void (*store)(void* settings, const SetupValue& value) = nullptr;
  /// What relates the value to those read with it; called when its own range holds it.
  std::optional<SettingRefusal> (*check)(const void* settings) = nullptr;

  std::string_view name() const { return facts.name; }
  bool isRequired() const { return facts.defaultValue.empty(); }
  bool isLeftOutByDefault() const { return facts.defaultValue == kNoDefault; }
};

/// One section of the setup file.
struct SectionRow {
  /// Names of the sections below the target, `/` between them; an item section's number is written `n`.
  std::string_view path;
  std::string_view readWhen;  ///< "always", or when
  std::string_view meaning;
  std::vector<KeywordRow> keywords = {};
  /// The name of the item that the settings are of, for refusals; null: the section's own name.
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
  if constexpr (std::is_same_v<Field, DateRecord>) return KeywordType::date;
  return KeywordType::integer;
}

/// Puts a value into a field, by the field's own type.
template <class Field>
void assign(Field& field, const SetupValue& value) {
  if constexpr (std::is_enum_v<Field>) {
    field = static_cast<Field>(std::get<std::int32_t>(value));
  } else if constexpr (std::is_same_v<Field, bool>) {
    field = (std::get<std::int32_t>(value) & 1) != 0;  // the lowest bit: -1 is a yes, too
  } else if constexpr (std::is_same_v<Field, std::optional<double>>) {
    field = std::get<double>(value);
  } else if constexpr (std::is_same_v<Field, std::vector<std::string>>) {
    field.push_back(std::get<std::string>(value));
  } else {
    field = std::get<Field>(value);
  }
}

}  // namespace settings_detail

/// A row whose value goes into the field that `fieldOf(settings)` names; `fieldOf` is a lambda without captures.
template <class Settings, class FieldOf>
KeywordRow setting(FieldOf, KeywordFacts facts) {
  using Field = std::remove_reference_t<decltype(std::declval<FieldOf>()(std::declval<Settings&>()))>;
  const KeywordType type = facts.type.value_or(
      std::is_same_v<Field, bool> || !facts.codes.empty() ? KeywordType::code : settings_detail::typeOf<Field>());
  if (std::is_same_v<Field, bool> && facts.codes.empty()) facts.codes = kNoYesNames;
  return {std::move(facts), type, [](void* settings, const SetupValue& value) {
            settings_detail::assign(FieldOf{}(*static_cast<Settings*>(settings)), value);
          }};
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

/// A coded row whose value is handed on as it was read, a number or a name: `take(settings, value)`.
template <class Settings, class Take>
KeywordRow choice(Take, KeywordFacts facts) {
  return {std::move(facts), KeywordType::code,
          [](void* settings, const SetupValue& value) { Take{}(*static_cast<Settings*>(settings), value); }};
}

/// The row with a check of what relates its value to others; `check(settings)` is a function or lambda without captures
/// that gives the refusal, or nothing.
template <class Settings, class Check>
KeywordRow checked(KeywordRow row, Check) {
  row.check = [](const void* settings) -> std::optional<SettingRefusal> {
    return Check{}(*static_cast<const Settings*>(settings));
  };
  return row;
}

/// SectionRow::itemName by `nameOf(settings)`, a lambda without captures.
template <class Settings, class NameOf>
auto itemName(NameOf) {
  return [](const void* settings) -> std::string { return NameOf{}(*static_cast<const Settings*>(settings)); };
}

/// The row of a list's count.
KeywordRow itemCount();
/// A row of a keyword that is known and not used.
KeywordRow unused(KeywordFacts facts, KeywordType type);

/// The name of a coded value, empty for one that has none.
std::string_view nameOfCode(std::span<const CodeName> codes, const SetupValue& value);

/// Whether a coded value, a number or a name as SetupValue has it, is the one meant here.
bool isCode(const CodeName& meant, const SetupValue& value);

}  // namespace mirevo

#include "run/results/restart_settings.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstddef>
#include <filesystem>
#include <map>
#include <tuple>
#include <unordered_map>
#include <utility>

#include <fmt/core.h>

#include "algorithms/analyses/uncertainty.h"
#include "common/checksum.h"
#include "common/files.h"
#include "common/named_items.h"
#include "common/text.h"
#include "common/version.h"
#include "run/access/setup_schema.h"
#include "run/tasks/correlation_reading.h"
#include "run/tasks/dream_section.h"
#include "run/tasks/repeated_search.h"
#include "run/tasks/sensitivity_section.h"

namespace mirevo {
namespace {

constexpr std::string_view kProgramLine = "Program";
constexpr std::string_view kSettingLine = "Setting";
constexpr std::string_view kFileLine = "File";
constexpr std::string_view kSearchLine = "Search";
constexpr std::string_view kLastLine = "End";
constexpr std::string_view kSeedKeyword = "Random_Seed";

bool namesAFileOfResults(const ResultSetting& setting) {
  return setting.keyword == "BatchFileName" || setting.keyword == "TemplateFileName" ||
         setting.keyword == "Initial_Sample_File_Name" || setting.keyword == "Earlier_Result_File" ||
         setting.keyword == "Instruction_File" || setting.keyword == "Instruction_Times" ||
         setting.keyword == "Values_File" || setting.keyword == "Correlation_File" ||
         (setting.keyword == "File_Name" && setting.section.ends_with("/OBSERVATION_FILE"));
}

/// The first `count` cells of a line, and the rest of the line, which may contain tabs.
std::vector<std::string> cellsOf(std::string_view line, std::size_t count) {
  const std::vector<std::string_view> cells = splitAt(line, '\t', count + 1);
  if (cells.size() <= count) return {};
  return {cells.begin(), cells.end()};
}

std::optional<std::uint64_t> unsignedNumber(std::string_view text, int base) {
  std::uint64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number, base);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return number;
}

/// Reads one line of the file; false if it is invalid.
bool readLine(std::string_view line, RestartSettings& settings) {
  if (line.starts_with(kProgramLine)) {
    auto cells = cellsOf(line, 1);
    if (cells.empty()) return false;
    settings.program = std::move(cells[1]);
    return true;
  }
  if (line.starts_with(kSettingLine)) {
    auto cells = cellsOf(line, 3);
    if (cells.empty()) return false;
    settings.settings.push_back({std::move(cells[1]), std::move(cells[2]), std::move(cells[3])});
    return true;
  }
  if (line.starts_with(kFileLine)) {
    auto cells = cellsOf(line, 5);
    if (cells.empty()) return false;
    const auto size = unsignedNumber(cells[3], 10);
    const auto check = unsignedNumber(cells[4], 16);
    if (!size || !check) return false;
    settings.files.push_back({std::move(cells[1]), std::move(cells[2]), std::move(cells[5]), *size, *check});
    return true;
  }
  if (line.starts_with(kSearchLine)) {
    const auto cells = cellsOf(line, 2);
    if (cells.empty()) return false;
    const auto budget = parseInteger(cells[1]);
    const auto last = parseInteger(cells[2]);
    if (!budget || !last || *last < 1 || *budget < *last) return false;
    settings.searches.push_back({*budget, *last});
    return true;
  }
  return line.empty() || line.front() == '#';
}

/// Of "0.2.0", also with something behind it; zeros of anything else.
std::array<int, 3> numbersOf(std::string_view version) {
  std::array<int, 3> numbers{};
  const std::vector<std::string_view> parts = splitAt(version, '.', numbers.size());
  for (std::size_t i = 0; i < parts.size(); ++i) {
    std::from_chars(parts[i].data(), parts[i].data() + parts[i].size(), numbers[i]);
  }
  return numbers;
}

/// Section, keyword, and how many of that keyword stand before it in the section: some may be given more than once.
using SettingKey = std::tuple<std::string_view, std::string_view, std::size_t>;
using SettingIndex = std::map<SettingKey, const ResultSetting*>;

/// One for each setting, in their order.
std::vector<SettingKey> keysOf(const RestartSettings& settings) {
  std::vector<SettingKey> keys;
  std::map<std::pair<std::string_view, std::string_view>, std::size_t> counts;
  for (const ResultSetting& setting : settings.settings) {
    keys.emplace_back(setting.section, setting.keyword, counts[{setting.section, setting.keyword}]++);
  }
  return keys;
}

SettingIndex indexOf(const RestartSettings& settings, const std::vector<SettingKey>& keys) {
  SettingIndex index;
  for (std::size_t i = 0; i < keys.size(); ++i) index[keys[i]] = &settings.settings[i];
  return index;
}

/// Whether the setting is the budget of a search or of Markov chains, which a restart may raise.
bool isBudget(const RestartSettings& settings, const ResultSetting& setting) {
  if (setting.keyword == kBudgetKeyword) return true;
  if (setting.section != kUncertaintySection || setting.keyword != kSampleSizeKeyword) return false;
  return std::ranges::any_of(settings.settings, [&](const ResultSetting& other) {
    return other.section == setting.section && other.keyword == kUncertaintyTypeKeyword && other.value == "'DREAM'";
  });
}

bool areSideBySide(const RestartSettings& settings) {
  return std::ranges::any_of(settings.settings, [](const ResultSetting& setting) {
    return setting.keyword == kRepetitionOrderKeyword &&
           setting.value == fmt::format("'{}'", repetitionOrderNames()[1].name);
  });
}

/// Whether further repetitions of a search follow those that were to be made; where they go on side by side, they would
/// stand among them.
bool addsRepetitions(const RestartSettings& then, const RestartSettings& now) {
  return searchRepetitions(now) > searchRepetitions(then) && !areSideBySide(now);
}

std::string_view withoutQuotes(std::string_view value) {
  return value.size() >= 2 && value.front() == '\'' ? value.substr(1, value.size() - 2) : value;
}

/// The number from 1 of the item that a setting names, of those whose names are in sections that begin so; its value
/// where that is not known.
std::string numberOfItem(const RestartSettings& settings, const ResultSetting& setting, std::string_view sections,
                         std::string_view nameKeyword) {
  if (!setting.value.starts_with('\'')) return setting.value;
  std::vector<std::string> names;
  for (const ResultSetting& other : settings.settings) {
    if (other.keyword != nameKeyword || !other.section.starts_with(sections)) continue;
    names.emplace_back(withoutQuotes(other.value));
  }
  const std::vector<std::size_t> meant = itemsNamed(withoutQuotes(setting.value), names);
  return meant.size() == 1 ? std::to_string(meant.front() + 1) : setting.value;
}

/// The value by which two setups are compared, which is what it means: an item that is named otherwise is the same, and
/// the sign of the seed of an analysis does not matter.
std::string comparedValue(const RestartSettings& settings, const ResultSetting& setting) {
  if (setting.keyword == kDreamObjectiveKeyword && setting.section == kDreamSectionName) {
    return numberOfItem(settings, setting, "ObjectiveFunctions/OBJECTIVE_FUNCTIONS/", "Name");
  }
  if (setting.keyword == kFirstParameterKeyword || setting.keyword == kSecondParameterKeyword) {
    return numberOfItem(settings, setting, "MODEL_PARAMETERS/", "Parameter_Name");
  }
  if (setting.keyword == kSeedKeyword &&
      (setting.section == kUncertaintySection || setting.section == kSensitivitySection)) {
    return std::string(setting.value.starts_with('-') ? std::string_view(setting.value).substr(1) : setting.value);
  }
  return setting.value;
}

/// A section for messages: "PARAMETER_3 (X3)" if the item has a name, else its whole path.
std::string shownSection(const SettingIndex& index, std::string_view section) {
  std::size_t start = 0;
  while (start < section.size()) {
    const std::size_t end = std::min(section.find('/', start), section.size());
    const std::string_view part = section.substr(start, end - start);
    for (const std::string_view keyword : {"Parameter_Name", "Name"}) {
      const auto name = index.find({section.substr(0, end), keyword, 0});
      if (itemPattern(part) == part || name == index.end()) continue;
      const std::string_view quoted = name->second->value;
      if (quoted.size() < 2) continue;  // of a file that was changed
      return fmt::format("{}{} ({})", part, section.substr(end), quoted.substr(1, quoted.size() - 2));
    }
    start = end + 1;
  }
  return std::string(section);
}

}  // namespace

RestartSettings restartSettings(const RunConfig& config) {
  RestartSettings result{std::string(programVersion()), config.resultSettings, {}, {}};
  if (config.task) result.searches = config.task->earlierSearches();
  std::unordered_map<std::string, FileMark> known;  // many measures may name one file
  for (const ResultSetting& setting : result.settings) {
    if (!namesAFileOfResults(setting) || setting.value.empty()) continue;
    const auto [entry, isNew] = known.try_emplace(setting.value);
    FileMark& mark = entry->second;
    if (isNew) {
      const auto content = readFileIfThere((std::filesystem::path(config.setupFolder) / setting.value).string());
      if (content) mark = {{}, {}, {}, content->size(), checksumOf(*content)};
    }
    result.files.push_back({setting.section, setting.keyword, setting.value, mark.size, mark.check});
  }
  return result;
}

std::string formatRestartSettings(const RestartSettings& settings) {
  std::string text = fmt::format(
      "# What the results beside this file depend on, as it was when they were computed by Mirevo {}.\n"
      "# A run with Restart = 1 holds its setup against it.\n",
      programVersion());
  if (!settings.program.empty()) text += fmt::format("{}\t{}\n", kProgramLine, settings.program);
  for (const ResultSetting& setting : settings.settings) {
    text += fmt::format("{}\t{}\t{}\t{}\n", kSettingLine, setting.section, setting.keyword, setting.value);
  }
  for (const FileMark& file : settings.files) {
    text += fmt::format("{}\t{}\t{}\t{}\t{:016x}\t{}\n", kFileLine, file.section, file.keyword, file.size, file.check,
                        file.name);
  }
  for (const EarlierSearch& search : settings.searches) {
    text += fmt::format("{}\t{}\t{}\n", kSearchLine, search.maxEvaluations, search.lastEvaluation);
  }
  return text + std::string(kLastLine) + '\n';
}

std::optional<RestartSettings> parseRestartSettings(std::string_view text) {
  RestartSettings settings;
  for (const std::string_view line : splitLines(text)) {
    if (line == kLastLine) return settings;
    if (!readLine(line, settings) && !isLaterVersion(settings.program)) return std::nullopt;
  }
  return std::nullopt;
}

bool isLaterVersion(std::string_view version) {
  return numbersOf(version) > numbersOf(programVersion());
}

std::optional<int> searchBudget(const RestartSettings& settings) {
  for (const ResultSetting& setting : settings.settings) {
    if (isBudget(settings, setting)) return parseInteger(setting.value);
  }
  return std::nullopt;
}

int searchRepetitions(const RestartSettings& settings) {
  for (const ResultSetting& setting : settings.settings) {
    if (setting.keyword == kRepetitionsKeyword) return parseInteger(setting.value).value_or(1);
  }
  return 1;
}

std::string repetitionsRemedy(const RestartSettings& then, const RestartSettings& now) {
  const int before = searchRepetitions(then);
  const std::int64_t further = std::int64_t{searchRepetitions(now)} - before;
  if (further <= 0 || !areSideBySide(now)) return {};
  std::string text =
      "Repetitions side by side take turns: evaluations of further ones would have stood among those that were made. ";
  if (!areSideBySide(then)) {
    return text + fmt::format("{} = '{}' lets them follow the earlier ones.", kRepetitionOrderKeyword,
                              repetitionOrderNames()[0].name);
  }
  std::int32_t seed = 1;
  for (const ResultSetting& setting : then.settings) {
    if (setting.keyword == kSeedKeyword) seed = parseInteger(setting.value).value_or(seed);
  }
  return text +
         fmt::format(
             "{0} = {1} goes on with the earlier run; a copy of the setup under another name, with {0} = {2} and "
             "{3} = {4}, makes the further ones.",
             kRepetitionsKeyword, before, further, kSeedKeyword, repetitionSeed(seed, before));
}

std::vector<std::string> changedSettings(const RestartSettings& then, const RestartSettings& now) {
  const std::vector<SettingKey> keysThen = keysOf(then);
  const std::vector<SettingKey> keysNow = keysOf(now);
  const SettingIndex before = indexOf(then, keysThen);
  const SettingIndex after = indexOf(now, keysNow);
  std::vector<std::string> changes;
  const auto note = [&](const ResultSetting& setting, const SettingIndex& index, std::string_view change) {
    changes.push_back(fmt::format("{} of {}: {}", setting.keyword, shownSection(index, setting.section), change));
  };
  const auto earlierBudget = searchBudget(then);
  const auto budget = searchBudget(now);
  const bool isRaised = budget && earlierBudget && *budget > *earlierBudget;
  const bool hasMoreRepetitions = addsRepetitions(then, now);
  for (std::size_t i = 0; i < keysNow.size(); ++i) {
    const ResultSetting& setting = now.settings[i];
    if (hasMoreRepetitions && setting.keyword == kRepetitionsKeyword) continue;
    const auto found = before.find(keysNow[i]);
    if (found == before.end()) {
      // An earlier version that did not know the keyword worked like its default.
      if (!setting.isDefault) note(setting, after, fmt::format("absent then, {} now", setting.value));
    } else if (comparedValue(then, *found->second) != comparedValue(now, setting) &&
               !(isRaised && isBudget(now, setting))) {
      note(setting, after, fmt::format("{} then, {} now", found->second->value, setting.value));
    }
  }
  for (std::size_t i = 0; i < keysThen.size(); ++i) {
    if (after.count(keysThen[i]) > 0) continue;
    note(then.settings[i], before, fmt::format("{} then, absent now", then.settings[i].value));
  }
  for (const FileMark& file : now.files) {
    const auto isSame = [&file](const FileMark& other) {
      return other.section == file.section && other.keyword == file.keyword && other.name == file.name;
    };
    const auto earlier = std::find_if(then.files.begin(), then.files.end(), isSame);
    if (earlier == then.files.end() || (earlier->size == file.size && earlier->check == file.check)) continue;
    note({file.section, file.keyword, {}}, after,
         fmt::format("the content of {} has changed, {} bytes then, {} now", file.name, earlier->size, file.size));
  }
  return changes;
}

}  // namespace mirevo

#include "run/tasks/distribution_reading.h"

#include <algorithm>
#include <optional>
#include <string>
#include <utility>

#include <fmt/format.h>

#include "algorithms/distributions/values_file.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "run/tasks/correlation_reading.h"
#include "run/tasks/sensitivity_section.h"

namespace mirevo {
namespace {

constexpr std::string_view kPrefix = "PARAMETER_";

constexpr DistributionSectionFacts kOfUncertainty{"UNCERTAINTY_ESTIMATION/PARAMETER_n", "for each variable parameter",
                                                  "The distribution of the n-th *variable* parameter, counted in the "
                                                  "order of `MODEL_PARAMETERS`. With GLUE and DREAM "
                                                  "a parameter without a section is uniform between its bounds.",
                                                  "Error: Standard deviation in uncertainty estimation invalid"};
constexpr DistributionSectionFacts kOfSensitivity{"SENSITIVITY_ANALYSIS/PARAMETER_n",
                                                  "if it is there, unless the analysis is local",
                                                  "The distribution of the n-th *variable* parameter, counted in the "
                                                  "order of `MODEL_PARAMETERS`. A parameter without "
                                                  "a section is uniform between its bounds.",
                                                  "Error: Standard deviation in sensitivity analysis invalid"};

const DistributionSectionFacts& factsOf(std::string_view task) {
  return task == kSensitivitySection ? kOfSensitivity : kOfUncertainty;
}

void readValuesFile(const SetupSection& section, DistributionSettings& settings) {
  section.checkAt(kValuesFileKeyword, [&] {
    std::string reason;
    const auto text = readTextFile(settings.valuesFile, reason);
    if (!text) fatalError("Error: Unable to open " + settings.valuesFile, reason);
    settings.values = readValues(*text, settings.valuesColumn, settings.valuesFile);
  });
}

/// One distribution keeps its keywords when another is chosen for a try: they are told, not refused.
void warnOfUnused(const SetupSection& section, const SectionRow& used, const SectionRow& all, DistributionKind kind) {
  for (const KeywordRow& row : all.keywords) {
    const auto isSame = [&](const KeywordRow& other) { return other.name() == row.name(); };
    if (!section.isWritten(row.name()) || std::ranges::any_of(used.keywords, isSame)) continue;
    section.warn(row.name(), fmt::format("not read: {} = '{}' does not use it", kDistributionKeyword,
                                         kDistributionNames[static_cast<std::size_t>(kind)].name));
  }
}

DistributionSettings readSettings(const SetupSection& item, const DistributionSectionFacts& facts,
                                  DistributionKind kind) {
  const SettingSection<DistributionSettings> section = distributionSection(facts, kind);
  DistributionSettings settings;
  item.read(section, settings);
  warnOfUnused(item, section.row, distributionRow(facts), kind);
  if (kind == DistributionKind::values) readValuesFile(item, settings);
  return settings;
}

}  // namespace

ParameterDistributions readDistributions(const TaskReading& reading, const SetupSection& section,
                                         MissingDistribution missing) {
  const std::size_t count = reading.variableCount;
  if (const auto surplus = section.itemBeyond(kPrefix, count)) {
    surplus->warn(surplus->name(),
                  fmt::format("not read: PARAMETER_n is the distribution of the n-th of the {} variable parameters. "
                              "If the sections are numbered by model parameter, each one that comes after a fixed or "
                              "dependent parameter is taken for another parameter's",
                              count));
  }
  const DistributionSectionFacts& facts = factsOf(section.name());
  std::vector<std::optional<SetupSection>> items;
  std::vector<DistributionSettings> settings;
  for (std::size_t j = 0; j < count; ++j) {
    const std::string name = fmt::format("{}{}", kPrefix, j + 1);
    const auto kind = section.peek(name, kDistributionKeyword);
    items.push_back(missing == MissingDistribution::isRefused ? section.openItem(kPrefix, j + 1)
                                                              : section.openIfPresent(name));
    settings.emplace_back();
    if (!items[j]) continue;
    settings[j] = readSettings(*items[j], facts, kind ? distributionKind(*kind) : DistributionKind::normal);
  }
  if (count == 0) return {};
  const SearchSpace space = BuildSearchSpace(reading.parameters);
  std::vector<DistributionPointer> made;
  for (std::size_t j = 0; j < count; ++j) {
    if (items[j]) items[j]->require(validateDistribution(settings[j], space, j));
    made.push_back(items[j] ? searchDistribution(settings[j], space, j)
                            : uniformDistribution(space.lower[j], space.upper[j]));
  }
  return ParameterDistributions(std::move(made), readCorrelations(section, space));
}

std::optional<std::string> firstDistribution(const SetupSection& section, std::size_t count) {
  for (std::size_t j = 1; j <= count; ++j) {
    std::string name = fmt::format("{}{}", kPrefix, j);
    if (section.has(name)) return name;
  }
  return std::nullopt;
}

std::vector<const SectionRow*> distributionSections(std::string_view task) {
  static const SectionRow ofUncertainty = distributionRow(kOfUncertainty);
  static const SectionRow ofSensitivity = distributionRow(kOfSensitivity);
  std::vector<const SectionRow*> rows{task == kSensitivitySection ? &ofSensitivity : &ofUncertainty};
  for (const SectionRow* row : correlationSections(task)) rows.push_back(row);
  return rows;
}

}  // namespace mirevo

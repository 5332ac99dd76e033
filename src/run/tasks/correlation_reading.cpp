#include "run/tasks/correlation_reading.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <string>
#include <utility>

#include <fmt/format.h>

#include "common/data_table.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/named_items.h"
#include "common/text.h"

namespace mirevo {
namespace {

using Matrix = std::vector<std::vector<double>>;

constexpr std::string_view kTypeKeyword = "Correlation_Type";
constexpr std::string_view kValueKeyword = "Correlation";
constexpr const char* kFileRefusal = "Error: Correlation file invalid";
/// Without codes: names only.
constexpr CodeName kTypeNames[] = {{std::nullopt, "normal scores"}, {std::nullopt, "rank"}};

struct CorrelationSettings {
  bool areRanks = false;
  std::string file;
};

struct CorrelatedPair {
  std::string first;
  std::string second;
  double correlation = 0.0;
};

struct Sections {
  SettingSection<CorrelationSettings> all;
  SettingSection<CorrelatedPair> pair;
};

Sections sectionsOf(std::string_view path, std::string_view pairPath) {
  return {
      {{path,
        "if it is there",
        "Correlations of the parameters whose distributions are given; parameters that are not named here are "
        "independent.",
        {itemCount(),
         choice<CorrelationSettings>(
             [](CorrelationSettings& s, const SetupValue& value) {
               s.areRanks = equalIgnoringCase(std::get<std::string>(value), kTypeNames[1].name);
             },
             {.name = kTypeKeyword,
              .defaultValue = "'normal scores'",
              .codes = kTypeNames,
              .meaning = "What the correlations are of: the normal scores of the parameters, which for normal "
                         "distributions on the search scale are the parameters themselves, or their ranks "
                         "(Spearman)."}),
         setting<&CorrelationSettings::file>(
             {.name = kCorrelationFileKeyword,
              .type = KeywordType::fileName,
              .defaultValue = kNoDefault,
              .meaning = "Table of correlations, such as the `<setup>_Correlation.dat` of a local sensitivity "
                         "analysis with a covariance. The pairs replace those of the file."})}}},
      {{pairPath,
        "for each pair",
        "The correlation of two variable parameters.",
        {setting<&CorrelatedPair::first>(
             {.name = kFirstParameterKeyword, .type = KeywordType::name, .meaning = "Name of a variable parameter."}),
         setting<&CorrelatedPair::second>(
             {.name = kSecondParameterKeyword, .type = KeywordType::name, .meaning = "Name of another."}),
         setting<&CorrelatedPair::correlation>({.name = kValueKeyword,
                                                .range = between(-1, 1),
                                                .refusal = "Error: Correlation of parameters invalid",
                                                .meaning = "Their correlation."})}}}};
}

const Sections& sections(std::string_view task) {
  static const Sections ofUncertainty =
      sectionsOf("UNCERTAINTY_ESTIMATION/CORRELATIONS", "UNCERTAINTY_ESTIMATION/CORRELATIONS/PAIR_n");
  static const Sections ofSensitivity =
      sectionsOf("SENSITIVITY_ANALYSIS/CORRELATIONS", "SENSITIVITY_ANALYSIS/CORRELATIONS/PAIR_n");
  return task == "UNCERTAINTY_ESTIMATION" ? ofUncertainty : ofSensitivity;
}

std::size_t parameterNamed(const std::string& name, std::string_view keyword, const SetupSection& section,
                           const SearchSpace& space) {
  const std::vector<std::size_t> meant = itemsNamed(name, space.names);
  if (meant.empty()) {
    const auto nearest = nearestName(name, space.names);
    section.refuse("Error: Unknown parameter in correlations", keyword,
                   fmt::format("expected the name of a variable parameter, found {}{}", quotedForMessage(name),
                               nearest ? fmt::format(", did you mean {}?", quotedForMessage(*nearest)) : ""));
  }
  if (meant.size() > 1) {
    section.refuse("Error: Parameter in correlations ambiguous", keyword, ambiguityText(name, space.names, meant));
  }
  return meant.front();
}

/// Fills the matrix with the correlations of the table's parameters that are variable, and returns their number. Throws
/// FatalError.
std::size_t takeTable(const ReadTable& table, const std::string& fileName, const SearchSpace& space, Matrix& matrix) {
  std::map<std::string, std::size_t> rowOf;
  for (std::size_t row = 0; row < table.rows.size(); ++row) {
    if (const auto& name = table.rows[row].front(); !rowOf.emplace(name, row).second) {
      fatalError(kFileRefusal, fmt::format("{}: {} is the name of several rows", fileName, quotedForMessage(name)));
    }
  }
  std::vector<std::size_t> taken;
  std::vector<std::size_t> columns;
  for (std::size_t j = 0; j < space.size(); ++j) {
    const auto column = table.column(space.names[j]);
    if (!column || *column == 0 || !rowOf.contains(space.names[j])) continue;
    if (std::ranges::count(table.columns, space.names[j]) > 1) {
      fatalError(kFileRefusal,
                 fmt::format("{}: {} is the name of several columns", fileName, quotedForMessage(space.names[j])));
    }
    taken.push_back(j);
    columns.push_back(*column);
  }
  if (taken.size() < std::min<std::size_t>(2, space.size())) {
    fatalError(
        kFileRefusal,
        fmt::format("{}: expected a tab-separated table with a row and a column for each of the parameters, two "
                    "or more of the variable ones, such as {}; found {}",
                    fileName, quotedForMessage(space.names[taken.empty() ? 0 : (taken.front() + 1) % space.size()]),
                    taken.empty() ? "none of them" : quotedForMessage(space.names[taken.front()]) + " alone"));
  }
  constexpr double kRounding = 1.0e-6;
  for (std::size_t a = 0; a < taken.size(); ++a) {
    for (std::size_t b = 0; b < taken.size(); ++b) {
      const std::string& cell = table.rows[rowOf.at(space.names[taken[a]])][columns[b]];
      const std::string where = fmt::format("{}: {} and {}", fileName, space.names[taken[a]], space.names[taken[b]]);
      const auto value = realCell(cell);
      if (!value || !(std::abs(*value) <= 1.0 + kRounding)) {
        fatalError(kFileRefusal,
                   fmt::format("{}: expected a correlation, from -1 to 1, found {}", where, quotedForMessage(cell)));
      }
      const double other = b < a ? matrix[taken[b]][taken[a]] : *value;
      if (std::abs(*value - other) > kRounding || (a == b && std::abs(*value - 1.0) > kRounding)) {
        fatalError(kFileRefusal, fmt::format("{}: expected {}, found {}", where,
                                             a == b ? "1, as a matrix of correlations has on its diagonal"
                                                    : formatReal(other) + ", as in the other half of the table",
                                             formatReal(*value)));
      }
      matrix[taken[a]][taken[b]] = a == b ? 1.0 : other;
    }
  }
  return taken.size();
}

void takeFile(const SetupSection& section, const std::string& path, const SearchSpace& space, Matrix& matrix) {
  section.checkAt(kCorrelationFileKeyword, [&] {
    std::string reason;
    const auto text = readTextFile(path, reason);
    if (!text) fatalError("Error: Unable to open " + path, reason);
    const std::size_t count = takeTable(readGivenTable(*text, kFileRefusal, path), path, space, matrix);
    section.note(kCorrelationFileKeyword,
                 fmt::format("correlations of {} of the {} variable parameters", count, space.size()));
  });
}

}  // namespace

std::vector<const SectionRow*> correlationSections(std::string_view task) {
  return {&sections(task).all.row, &sections(task).pair.row};
}

std::optional<GaussianCopula> readCorrelations(const SetupSection& section, const SearchSpace& space) {
  const auto given = section.openIfPresent("CORRELATIONS");
  if (!given) return std::nullopt;
  const Sections& rows = sections(section.name());
  CorrelationSettings settings;
  given->read(rows.all, settings);
  Matrix matrix(space.size(), std::vector<double>(space.size()));
  for (std::size_t j = 0; j < space.size(); ++j) matrix[j][j] = 1.0;
  if (!settings.file.empty()) takeFile(*given, settings.file, space, matrix);
  std::vector<CorrelatedPair> pairs;
  std::map<std::pair<std::size_t, std::size_t>, std::pair<double, std::string>> earlierPairs;  // with its place
  given->readItems("PAIR_", rows.pair, pairs, [&](const SetupSection& item, const CorrelatedPair& pair) {
    const std::size_t i = parameterNamed(pair.first, kFirstParameterKeyword, item, space);
    const std::size_t j = parameterNamed(pair.second, kSecondParameterKeyword, item, space);
    if (i == j) {
      item.refuse("Error: Correlation of parameters invalid", kSecondParameterKeyword,
                  fmt::format("expected another parameter than {}", space.names[i]));
    }
    const auto [earlier, isNew] =
        earlierPairs.try_emplace(std::minmax(i, j), pair.correlation, item.location(kValueKeyword));
    if (!isNew && earlier->second.first != pair.correlation) {
      item.refuse(
          "Error: Correlation of parameters given twice", kValueKeyword,
          fmt::format("{} and {} have {} at {}, found {}: leave one of the pairs out", space.names[i], space.names[j],
                      formatReal(earlier->second.first), earlier->second.second, formatReal(pair.correlation)));
    }
    matrix[i][j] = matrix[j][i] = pair.correlation;
  });
  bool areCorrelated = false;
  for (std::size_t i = 0; i < space.size(); ++i) {
    for (std::size_t j = 0; j < space.size(); ++j) {
      if (i == j) continue;
      areCorrelated = areCorrelated || matrix[i][j] != 0.0;
      if (settings.areRanks) matrix[i][j] = ofRankCorrelation(matrix[i][j]);
    }
  }
  if (!areCorrelated) return std::nullopt;
  std::optional<GaussianCopula> copula;
  given->checkAt(settings.file.empty() ? kTypeKeyword : kCorrelationFileKeyword,
                 [&] { copula.emplace(std::move(matrix), space.names); });
  return copula;
}

}  // namespace mirevo

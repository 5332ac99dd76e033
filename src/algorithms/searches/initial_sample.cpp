#include "algorithms/searches/initial_sample.h"

#include <algorithm>
#include <cmath>
#include <optional>

#include <fmt/core.h>

#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/numbers/sobol.h"
#include "common/encoding.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"

namespace mirevo {
namespace {

constexpr int kMaximinTries = 50;
constexpr std::string_view kInvalidFile = "Error: Initial sample file invalid";

UnitPoints uniformPoints(std::size_t count, std::size_t dimension, UniformGenerator& random) {
  UnitPoints points(count, std::vector<double>(dimension));
  for (auto& point : points) {
    for (double& coordinate : point) coordinate = random.next();
  }
  return points;
}

UnitPoints drawUnitPoints(SampleGeneration generation, std::size_t count, std::size_t dimension,
                          UniformGenerator& random) {
  switch (generation) {
    case SampleGeneration::uniformRandom:
      return uniformPoints(count, dimension, random);
    case SampleGeneration::latinHypercube:
      return latinHypercube(count, dimension, random);
    case SampleGeneration::scrambledSobol:
      if (dimension > kMaxSobolDimension) break;
      return scrambledSobol(count, dimension, random);
    case SampleGeneration::maximinLatinHypercube:
      return maximinLatinHypercube(count, dimension, kMaximinTries, random);
    case SampleGeneration::fromFile:
      break;
  }
  fatalError(
      "Error: Initial sample generation method invalid",
      fmt::format("method {} cannot draw a sample of {} variable parameters", static_cast<int>(generation), dimension));
}

ParameterSet withinBounds(const std::vector<double>& unitPoint, const SearchBounds& bounds) {
  ParameterSet set(bounds.size());
  for (std::size_t j = 0; j < set.size(); ++j) {
    const double value = bounds.lower[j] + unitPoint[j] * (bounds.upper[j] - bounds.lower[j]);
    set[j] = std::clamp(value, bounds.lower[j], bounds.upper[j]);
  }
  return set;
}

/// Splits rows into cells at the separator found in the header row.
class RowSplitter {
 public:
  explicit RowSplitter(std::string_view header) {
    for (const char candidate : {'\t', ';', ','}) {
      if (header.find(candidate) != std::string_view::npos) {
        separator_ = candidate;
        break;
      }
    }
  }

  std::vector<std::string_view> operator()(std::string_view row) const {
    std::vector<std::string_view> cells;
    std::size_t begin = 0;
    while (begin <= row.size()) {
      const std::size_t end =
          std::min(row.size(), separator_ == ' ' ? row.find_first_of(" \t", begin) : row.find(separator_, begin));
      const std::string_view cell = trim(row.substr(begin, end - begin));
      if (separator_ != ' ' || !cell.empty()) cells.push_back(cell);
      begin = end + 1;
    }
    return cells;
  }

 private:
  char separator_ = ' ';
};

/// Without quotes around it, which some programs write around headings.
std::string_view withoutQuotes(std::string_view name) {
  const bool isQuoted = name.size() > 1 && name.front() == '"' && name.back() == '"';
  return isQuoted ? name.substr(1, name.size() - 2) : name;
}

/// Entry c of the result is the index of the parameter in column c.
std::vector<std::size_t> parametersOfColumns(const std::vector<std::string_view>& header, const std::string& place,
                                             const SearchSpace& space) {
  std::vector<std::size_t> parameters;
  for (std::string_view name : header) {
    auto found = std::find(space.names.begin(), space.names.end(), name);
    if (found == space.names.end()) {
      name = withoutQuotes(name);
      found = std::find(space.names.begin(), space.names.end(), name);
    }
    if (found == space.names.end()) {
      const std::optional<std::string> near = nearestName(name, space.names);
      const std::string hint = near              ? fmt::format("; did you mean \"{}\"?", *near)
                               : parseReal(name) ? "; the names are expected in a row above the values"
                                                 : "";
      fatalError(kInvalidFile, fmt::format("{}: \"{}\" is not the name of a variable parameter{}", place, name, hint));
    }
    const auto parameter = static_cast<std::size_t>(found - space.names.begin());
    if (std::find(parameters.begin(), parameters.end(), parameter) != parameters.end()) {
      fatalError(kInvalidFile, fmt::format("{}: parameter \"{}\" has a second column", place, name));
    }
    parameters.push_back(parameter);
  }
  for (std::size_t j = 0; j < space.size(); ++j) {
    if (std::find(parameters.begin(), parameters.end(), j) == parameters.end()) {
      fatalError(kInvalidFile, fmt::format("{}: no column for parameter \"{}\"", place, space.names[j]));
    }
  }
  return parameters;
}

/// Adds the set of a row to the sample.
void readRow(const std::vector<std::string_view>& cells, const std::vector<std::size_t>& parameters,
             const std::string& place, const SearchSpace& space, GivenSample& sample) {
  if (cells.size() != parameters.size()) {
    fatalError(kInvalidFile, fmt::format("{}: found {} values, expected {}, one for each name in the header", place,
                                         cells.size(), parameters.size()));
  }
  ParameterSet& set = sample.sets.emplace_back(space.size());
  ParameterSet& given = sample.modelScale.emplace_back(space.size());
  for (std::size_t column = 0; column < cells.size(); ++column) {
    const std::size_t j = parameters[column];
    const std::optional<double> value = parseReal(cells[column]);
    if (!value) {
      fatalError(kInvalidFile, fmt::format("{}: found \"{}\", expected a number for parameter \"{}\"", place,
                                           cells[column], space.names[j]));
    }
    const std::optional<double> transformed = sampleValue(*value, j, space);
    if (!transformed) {
      fatalError(kInvalidFile, fmt::format("{}: value {} of parameter \"{}\" lies outside its bounds", place,
                                           cells[column], space.names[j]));
    }
    set[j] = *transformed;
    given[j] = *value;
  }
}

}  // namespace

const SettingSection<InitialSampleSection>& initialSampleSection() {
  static constexpr CodeName kNames[] = {{0, "uniform random"},
                                        {1, "Latin hypercube"},
                                        {2, "scrambled Sobol"},
                                        {3, "maximin Latin hypercube"},
                                        {4, "from file"}};
  static constexpr CodeName kOrders[] = {{std::nullopt, "best"}, {std::nullopt, "first"}};
  static const SettingSection<InitialSampleSection> section{
      {"OPTIMISATION_ALGORITHM/INITIAL_SAMPLE",
       "when `Option` is 2",
       "Where the search starts.",
       {setting<InitialSampleSection>(
            [](auto& s) -> auto& { return s.sample.includeInitialParameters; },
            {.name = "Include_Initial_Parameters",
             .defaultValue = "1",
             .meaning = "1: the initial values are the first set of the sample; DDS then starts from them alone. 0: "
                        "they are not."}),
        setting<InitialSampleSection>(
            [](auto& s) -> auto& { return s.randomSeed; },
            {.name = "Random_Seed",
             .defaultValue = "1",
             .meaning = "Seed of the run; the same seed gives the same results. The same setting as the uncertainty "
                        "analysis's."}),
        setting<InitialSampleSection>([](auto& s) -> auto& { return s.sample.generation; },
                                      {.name = "Initial_Sample_Generation",
                                       .defaultValue = "1",
                                       .range = between(0, 4),
                                       .codes = kNames,
                                       .refusal = "Error: Initial sample generation method invalid",
                                       .meaning = "How the sample is drawn: 2 is a Sobol sequence, 3 a Latin hypercube "
                                                  "with maximin distance, 4 is read from the file."}),
        setting<InitialSampleSection>([](auto& s) -> auto& { return s.sample.fileName; },
                                      {.name = kInitialSampleFileKeyword,
                                       .type = KeywordType::fileName,
                                       .defaultValue = "''",
                                       .meaning = "The file of generation 4."}),
        setting<InitialSampleSection>([](auto& s) -> auto& { return s.sample.earlierFile; },
                                      {.name = kEarlierFileKeyword,
                                       .type = KeywordType::fileName,
                                       .defaultValue = kNoDefault,
                                       .meaning = "The result file of an earlier run, of this or another setup with "
                                                  "the same variable parameters: sets of it come behind the initial "
                                                  "one, and the rest of the sample is drawn. Their model runs are "
                                                  "made anew."}),
        choice<InitialSampleSection>(
            [](InitialSampleSection& s, const SetupValue& value) {
              const auto& name = std::get<std::string>(value);
              s.sample.earlierOrder = name == kOrders[0].name ? EarlierOrder::best : EarlierOrder::first;
            },
            {.name = kEarlierOrderKeyword,
             .defaultValue = kNoDefault,
             .codes = kOrders,
             .meaning = "Which of its successful evaluations: those with the least aggregate, or the first. Without "
                        "it, the best."}),
        setting<InitialSampleSection>([](auto& s) -> auto& { return s.sample.mostEarlierSets; },
                                      {.name = kEarlierSetsKeyword,
                                       .defaultValue = kNoDefault,
                                       .range = from(1),
                                       .refusal = "Error: No. of sets of the earlier result file invalid",
                                       .meaning = "How many different sets at most. Without it, as many as the "
                                                  "population has room for; one for DDS and PDDS."})}}};
  return section;
}

SearchBounds searchBounds(const SearchSpace& space) {
  // Ten times the tolerance within which the integer rule takes a value as the next integer.
  constexpr double kBelowNextInteger = 1.0e-7;
  SearchBounds bounds{space.lower, space.upper, space.initial, std::vector<bool>(space.size())};
  for (std::size_t j = 0; j < space.size(); ++j) {
    bounds.isInteger[j] = space.transformation[j] == TransformationType::integer;
    if (bounds.isInteger[j]) bounds.upper[j] -= kBelowNextInteger;
  }
  return bounds;
}

std::optional<double> sampleValue(double value, std::size_t j, const SearchSpace& space) {
  const bool isInteger = space.transformation[j] == TransformationType::integer;
  const double lower = space.lower[j];
  const double upper = isInteger ? space.upper[j] - 1.0 : space.upper[j];
  bool failed = false;
  const double transformed =
      TransformParameterValue(value, lower, space.transformation[j], TransformDirection::forward, failed);
  // The integer rule truncates towards zero, so that a value just below the lower bound would become the bound.
  const double compared = isInteger ? value : transformed;
  const double tolerance = 1.0e-12 * std::max({1.0, std::abs(lower), std::abs(upper)});
  if (failed || !(compared >= lower - tolerance)) return std::nullopt;
  if (!(transformed <= upper + tolerance)) return std::nullopt;
  return std::clamp(transformed, lower, upper);
}

std::vector<ParameterSet> drawInitialSample(const InitialSampleSettings& settings,
                                            std::span<const ParameterSet> givenSets, const SearchBounds& bounds,
                                            std::size_t count, UniformGenerator& random) {
  std::vector<ParameterSet> sample;
  sample.reserve(count);
  if (settings.includeInitialParameters && count > 0) sample.push_back(bounds.initial);
  const std::size_t drawn = count - sample.size();
  if (settings.generation == SampleGeneration::fromFile) {
    if (givenSets.size() < drawn) {
      fatalError(kInvalidFile,
                 fmt::format("{}: found {} sets, expected at least {}", settings.fileName, givenSets.size(), drawn));
    }
    sample.insert(sample.end(), givenSets.begin(), givenSets.begin() + static_cast<std::ptrdiff_t>(drawn));
    return sample;
  }
  const std::size_t given = std::min(givenSets.size(), drawn);
  sample.insert(sample.end(), givenSets.begin(), givenSets.begin() + static_cast<std::ptrdiff_t>(given));
  if (given == drawn) return sample;
  for (const auto& point : drawUnitPoints(settings.generation, drawn - given, bounds.size(), random)) {
    sample.push_back(withinBounds(point, bounds));
  }
  return sample;
}

std::size_t givenSetCount(const InitialSampleSettings& settings, std::size_t givenSets, std::size_t count) {
  if (settings.generation == SampleGeneration::fromFile) return count;
  return std::min((settings.includeInitialParameters ? 1 : 0) + givenSets, count);
}

GivenSample readInitialSample(std::string_view fileName, std::string_view text, const SearchSpace& space) {
  if (const std::string fault = faultOfEncoding(text); !fault.empty()) {
    fatalError(kInvalidFile, fmt::format("{}: {}", fileName, fault));
  }
  takeText(text, kByteOrderMark);
  GivenSample sample;
  std::optional<RowSplitter> splitter;
  std::vector<std::size_t> parameters;
  int lineNumber = 0;
  for (std::string_view line : splitLines(text)) {
    ++lineNumber;
    line = trim(line);
    if (line.empty() || line.front() == '#') continue;
    const std::string place = fmt::format("{}:{}", fileName, lineNumber);
    if (!splitter) {
      splitter.emplace(line);
      parameters = parametersOfColumns((*splitter)(line), place, space);
    } else {
      readRow((*splitter)(line), parameters, place, space, sample);
    }
  }
  if (sample.sets.empty()) {
    fatalError(kInvalidFile, fmt::format("{}: expected a header of parameter names and one set a row, found {}",
                                         fileName, splitter ? "a header alone" : "nothing"));
  }
  return sample;
}

GivenSample loadInitialSample(const std::string& fileName, const SearchSpace& space) {
  std::string reason;
  const std::optional<std::string> text = readTextFile(fileName, reason);
  if (!text) fatalError(kInvalidFile, fmt::format("{}: {}", fileName, reason));
  return readInitialSample(fileName, *text, space);
}

}  // namespace mirevo

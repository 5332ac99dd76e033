#include "run/tasks/dream_section.h"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <string>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "common/named_items.h"
#include "common/short_list.h"
#include "common/text.h"
#include "measures/period_series.h"

namespace mirevo {
namespace {

/// The value of the enumerator with this name, of a coded keyword whose codes are names in the order of the
/// enumerators.
template <class Enum, std::size_t Count>
Enum named(const CodeName (&names)[Count], const SetupValue& value) {
  std::size_t found = 0;
  for (std::size_t k = 0; k < Count; ++k) {
    if (isCode(names[k], value)) found = k;
  }
  return static_cast<Enum>(found);
}

constexpr std::string_view kErrorModelRefusal = "Error: Error model of DREAM invalid";

constexpr char kDeviationMeaning[] =
    "Standard deviation of the errors; in the unit of the transformed series with `Box_Cox_Lambda`; with "
    "`Error_Share` its part that is the same for all values; with `Likelihood = 'Student'` the scale. A fixed one is "
    "above 0. The prior is uniform for its logarithm, with a lower bound of 0 for the deviation itself.";

constexpr const char* kTermMeanings[] = {
    kDeviationMeaning,
    "Part of the standard deviation that grows with the simulated value.",
    "Correlation of the errors of one observation and the next.",
    "Lambda of the Box-Cox transformation of simulated and observed values; 1: none, 0: logarithm.",
    "Degrees of freedom of Student's t distribution. The prior is uniform for the logarithm.",
    "Skewness xi of the generalised likelihood; 1: symmetric. The prior is uniform for the logarithm.",
    "Kurtosis beta of the generalised likelihood; towards -1 nearly uniform, 0: normal, 1: double exponential.",
    "Bias mu_h of the generalised likelihood: a simulated value f counts as f exp(mu_h f).",
};

/// What a term is where the setup says nothing of it.
std::string defaultMeaning(ErrorTerm term) {
  const ErrorTermRow& row = errorTermRows()[term];
  std::vector<std::string> estimating;
  bool isElsewhere = false;
  for (std::size_t k = 0; k < std::size(kLikelihoodNames); ++k) {
    const auto form = static_cast<LikelihoodForm>(k);
    if (hasTerm(form, term)) {
      estimating.push_back(fmt::format("'{}'", kLikelihoodNames[k].name));
    } else {
      isElsewhere = isElsewhere || readsTerm(form, term);
    }
  }
  if (estimating.empty()) return fmt::format(" Default {:g}.", row.neutral);
  const std::string bounds = term == kDeviation
                                 ? fmt::format("{:g} and {:g} times the standard deviation of the observations",
                                               kLeastDeviation, kMostDeviation)
                                 : fmt::format("{:g} and {:g}", row.lower, row.upper);
  return fmt::format(
      " By default it is estimated between {}{}.", bounds,
      isElsewhere ? fmt::format(" with {}, and is {:g} otherwise", fmt::join(estimating, " and "), row.neutral) : "");
}

template <class Settings, std::size_t Term>
KeywordRow termRow(ErrorModelSettings& (*modelOf)(Settings&)) {
  static_cast<void>(modelOf);
  const ErrorTermRow& row = errorTermRows()[Term];
  std::string meaning = kTermMeanings[Term];
  if (std::is_same_v<Settings, DreamSection>) {
    meaning +=
        " One number: it is fixed; two: it is estimated between them." + defaultMeaning(static_cast<ErrorTerm>(Term));
  }
  const bool isLimited = std::isfinite(row.least) || std::isfinite(row.most);
  return setting<Settings>(
      [](Settings& settings) -> std::vector<double>& {
        if constexpr (std::is_same_v<Settings, DreamSection>) {
          return settings.errors.terms[Term];
        } else {
          return settings.terms[Term];
        }
      },
      {.name = row.keyword,
       .defaultValue = kNoDefault,
       .range = {row.least, row.most},
       .refusal = isLimited ? kErrorModelRefusal : std::string_view(),
       .meaning = std::move(meaning)});
}

template <class Settings, std::size_t... Terms>
void appendTerms(std::vector<KeywordRow>& rows, std::index_sequence<Terms...> /*terms*/) {
  (rows.push_back(termRow<Settings, Terms>(nullptr)), ...);
}

std::vector<KeywordRow> dreamRows() {
  std::vector<KeywordRow> rows{
      choice<DreamSection>(
          [](DreamSection& s, const SetupValue& value) {
            s.errors.form = named<LikelihoodForm>(kLikelihoodNames, value);
          },
          {.name = kLikelihoodKeyword,
           .codes = kLikelihoodNames,
           .meaning = "How the errors of the simulated series are distributed. 'objective': the log-likelihood is "
                      "minus an objective function, for models that give their own."}),
      choice<DreamSection>(
          [](DreamSection& s, const SetupValue& value) {
            if (const auto* number = std::get_if<std::int32_t>(&value)) s.objective = *number;
            if (const auto* name = std::get_if<std::string>(&value)) s.objectiveName = *name;
          },
          {.name = kDreamObjectiveKeyword,
           .type = KeywordType::item,
           .defaultValue = "0",
           .range = from(0),
           .refusal = kDreamRefusal,
           .meaning = "With `Likelihood = 'objective'`, the objective function; 0: the aggregate of all."}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.chainCount; },
                            {.name = "Chain_Count",
                             .defaultValue = "4",
                             .range = between(3, 1000),
                             .refusal = kDreamRefusal,
                             .meaning = "Markov chains. Each generation runs the model once for each, all at a time."}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.burnInShare; },
                            {.name = "Burn_In_Share",
                             .defaultValue = "0.2",
                             .range = between(0.0, 0.9),
                             .refusal = kDreamRefusal,
                             .unit = "of `Sample_Size`",
                             .meaning = "Model runs at the beginning that are no part of the posterior. Crossover "
                                        "probabilities and outlier chains are dealt with in them alone."}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.rHatLimit; },
                            {.name = "R_Hat_Limit",
                             .defaultValue = "1.05",
                             .range = from(1.0),
                             .refusal = kDreamRefusal,
                             .meaning = "The run ends before its budget once R-hat of all parameters is at most this "
                                        "...",
                             .bearsOnResults = kNotOfResults}),
      setting<DreamSection>(
          [](auto& s) -> auto& { return s.sampler.effectiveSize; },
          {.name = kEffectiveSizeKeyword,
           .defaultValue = "400",
           .range = kPositive,
           .refusal = kDreamRefusal,
           .meaning = "... and the effective sample size of each at least this. It can be no more than "
                      "the evaluations behind burn-in.",
           .bearsOnResults = kNotOfResults}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.pairCount; },
                            {.name = "Max_Pairs",
                             .defaultValue = "3",
                             .range = between(1, 10),
                             .refusal = kDreamRefusal,
                             .meaning = "Most pairs of archive members whose differences make a jump."}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.crossoverCount; },
                            {.name = "Crossover_Values",
                             .defaultValue = "3",
                             .range = between(1, 100),
                             .refusal = kDreamRefusal,
                             .meaning = "Number n of crossover values 1/n, 2/n ... 1: the share of the parameters that "
                                        "a jump changes."}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.snookerShare; },
                            {.name = "Snooker_Share",
                             .defaultValue = "0.1",
                             .range = between(0.0, 0.9),
                             .refusal = kDreamRefusal,
                             .meaning = "Share of snooker updates among the jumps."}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.archiveInterval; },
                            {.name = "Archive_Interval",
                             .defaultValue = "10",
                             .range = from(1),
                             .refusal = kDreamRefusal,
                             .unit = "generations",
                             .meaning = "How often the states of the chains are added to the archive."}),
      setting<DreamSection>([](auto& s) -> auto& { return s.sampler.archiveStart; },
                            {.name = "Archive_Start",
                             .defaultValue = "0",
                             .range = between(0, 1'000'000),
                             .refusal = kDreamRefusal,
                             .meaning = "Draws from the prior in the archive at the beginning, which need no model "
                                        "run; 0: ten for each parameter."}),
      choice<DreamSection>(
          [](DreamSection& s, const SetupValue& value) {
            s.sampler.boundary = named<BoundaryHandling>(kBoundaryNames, value);
          },
          {.name = "Boundary_Handling",
           .defaultValue = "'fold'",
           .codes = kBoundaryNames,
           .meaning = "What becomes of a jump that leaves the bounds: it comes in again on the opposite side, or is "
                      "rejected. Both keep detailed balance."})};
  appendTerms<DreamSection>(rows, std::make_index_sequence<kErrorTermCount>());
  rows.push_back(setting<DreamSection>([](auto& s) -> auto& { return s.errors.shift; },
                                       {.name = "Box_Cox_Shift",
                                        .defaultValue = kNoDefault,
                                        .unit = "of the series",
                                        .meaning = "Added to simulated and observed values before the Box-Cox "
                                                   "transformation, so that all are above 0. Default 0."}));
  return rows;
}

std::vector<KeywordRow> errorModelRows() {
  std::vector<KeywordRow> rows{choice<ErrorModelSettings>(
      [](ErrorModelSettings& s, const SetupValue& value) { s.form = named<LikelihoodForm>(kLikelihoodNames, value); },
      {.name = kLikelihoodKeyword, .defaultValue = kNoDefault, .codes = kLikelihoodNames, .meaning = "Its form."})};
  appendTerms<ErrorModelSettings>(rows, std::make_index_sequence<kErrorTermCount>());
  rows.push_back(setting<&ErrorModelSettings::shift>(
      {.name = "Box_Cox_Shift", .defaultValue = kNoDefault, .unit = "of the series", .meaning = "As there."}));
  return rows;
}

void checkTerms(const SetupSection& section, const ErrorModelSettings& settings) {
  for (std::size_t k = 0; k < kErrorTermCount; ++k) {
    const std::vector<double>& numbers = settings.terms[k];
    const ErrorTermRow& row = errorTermRows()[k];
    const auto refuse = [&](const std::string& explanation) {
      section.refuse(kErrorModelRefusal, row.keyword, explanation);
    };
    if (numbers.empty()) continue;
    if (numbers.size() > 2) {
      refuse(fmt::format("expected one number (a fixed value) or two (bounds), found {}", numbers.size()));
    }
    const bool isFixedAtZero = k == kDeviation && numbers == std::vector<double>{0.0};
    const ValueRange range{row.least, row.most, isFixedAtZero};
    for (const double number : numbers) {
      if (!range.contains(number)) refuse(fmt::format("expected {}, found {}", range.text(), formatReal(number)));
    }
    if (numbers.size() == 2 && !(numbers[0] < numbers[1])) {
      refuse(fmt::format("expected a lower bound below the upper one, found {} and {}", formatReal(numbers[0]),
                         formatReal(numbers[1])));
    }
  }
}

std::string_view nameOf(LikelihoodForm form) {
  return kLikelihoodNames[static_cast<std::size_t>(form)].name;
}

bool hasTransformation(LikelihoodForm form, const ErrorModelSettings& common, const ErrorModelSettings& own) {
  const std::vector<double>& lambda = own.terms[kLambda].empty() ? common.terms[kLambda] : own.terms[kLambda];
  if (form == LikelihoodForm::objective) return false;
  return lambda.empty() ? hasTerm(form, kLambda) : lambda != std::vector<double>{1.0};
}

/// Refuses what is written in `section` though none of the error models that have it depends on it: estimated, it would
/// have its prior for a posterior. `models`: forms, each with the settings that go before `common`.
using ErrorModels = std::vector<std::pair<LikelihoodForm, const ErrorModelSettings*>>;
void refuseUnread(const SetupSection& section, const ErrorModelSettings& written, const ErrorModelSettings& common,
                  const ErrorModels& models) {
  const auto refuse = [&](std::string_view keyword, std::string_view expected) {
    section.refuse(kErrorModelRefusal, keyword,
                   fmt::format("{} = '{}' does not depend on it: expected {}, or no {}", kLikelihoodKeyword,
                               nameOf(models.front().first), expected, keyword));
  };
  for (std::size_t k = 0; k < kErrorTermCount; ++k) {
    const auto isRead = [k](const auto& model) { return readsTerm(model.first, static_cast<ErrorTerm>(k)); };
    if (written.terms[k].empty() || std::ranges::any_of(models, isRead)) continue;
    refuse(errorTermRows()[k].keyword, k == kFreedom                      ? "'Student'"
                                       : k == kSkewness || k == kKurtosis ? "'generalised'"
                                                                          : "the likelihood of a series");
  }
  const auto isTransformed = [&](const auto& model) { return hasTransformation(model.first, common, *model.second); };
  if (written.shift && !std::ranges::any_of(models, isTransformed)) {
    refuse("Box_Cox_Shift", "'Box-Cox', or a Box_Cox_Lambda other than 1");
  }
}

/// The number of the objective function that the setup names.
std::int32_t numberOfObjective(const SetupSection& dream, const std::string& name,
                               std::span<const ObjectiveFunction> objectives) {
  std::vector<std::string> names;
  for (const ObjectiveFunction& objective : objectives) names.push_back(objective.name);
  const std::vector<std::size_t> meant = itemsNamed(name, names);
  if (meant.size() > 1)
    dream.refuse(kDreamLikelihoodRefusal, kDreamObjectiveKeyword, ambiguityText(name, names, meant));
  if (meant.size() == 1) return static_cast<std::int32_t>(meant.front()) + 1;
  constexpr std::size_t kMostNamed = 20;
  ShortList known(kMostNamed);
  for (const std::string& each : names) known.add(quotedForMessage(trim(each)));
  dream.refuse(kDreamLikelihoodRefusal, kDreamObjectiveKeyword,
               fmt::format("expected 0 to {} or the name of an objective function, {}; found {}", names.size(),
                           known.text(), quotedForMessage(name)));
}

/// What depends on other settings of the section, or on what the likelihood is of.
void checkDream(const SetupSection& dream, const DreamSection& settings, std::size_t objectiveCount,
                bool comparesSeries) {
  const DreamSettings& sampler = settings.sampler;
  const double behindBurnIn = sampler.mostRuns - sampler.burnInRuns();
  if (dream.isWritten(kEffectiveSizeKeyword) && sampler.effectiveSize > behindBurnIn) {
    dream.refuse(kDreamRefusal, kEffectiveSizeKeyword,
                 fmt::format("expected at most {:g}, the part of Sample_Size behind burn-in, found {:g}", behindBurnIn,
                             sampler.effectiveSize));
  }
  if (settings.errors.form == LikelihoodForm::objective) {
    if (static_cast<std::size_t>(settings.objective) > objectiveCount) {
      dream.refuse(kDreamLikelihoodRefusal, kDreamObjectiveKeyword,
                   fmt::format("expected 0 to {}, found {}", objectiveCount, settings.objective));
    }
    return;
  }
  if (!comparesSeries) {
    dream.refuse(kDreamLikelihoodRefusal, kLikelihoodKeyword,
                 "no objective function compares time series: expected 'objective'");
  }
  if (dream.isWritten(kDreamObjectiveKeyword)) {
    dream.refuse(kErrorModelRefusal, kDreamObjectiveKeyword,
                 fmt::format("{} = '{}' does not depend on it: expected 'objective', or no {}", kLikelihoodKeyword,
                             nameOf(*settings.errors.form), kDreamObjectiveKeyword));
  }
}

}  // namespace

const SettingSection<DreamSection>& dreamSection() {
  static const SettingSection<DreamSection> section{
      {kDreamSectionName, "when `Uncertainty_Type` is 'DREAM'",
       "The posterior distribution by Markov chains, DREAM(ZS). `Sample_Size` is the most evaluations that it makes, "
       "and at least ten for each chain.",
       dreamRows()}};
  return section;
}

const SettingSection<ErrorModelSettings>& errorModelSection() {
  static const SettingSection<ErrorModelSettings> section{
      {"UNCERTAINTY_ESTIMATION/DREAM/ERROR_MODEL_n", "if present",
       "The error model of output measure n, where it differs from that of `DREAM`: the keywords mean what they mean "
       "there.",
       errorModelRows()}};
  return section;
}

std::vector<std::size_t> measuresOfLikelihood(std::span<const OutputMeasure> measures,
                                              std::span<const ObjectiveFunction> objectives) {
  std::vector<std::size_t> found;
  for (std::size_t m = 0; m < measures.size(); ++m) {
    if (measures[m].interfaceType != InterfaceType::timeSeries) continue;
    const bool isCounted = std::ranges::any_of(objectives, [m](const ObjectiveFunction& objective) {
      return std::ranges::any_of(objective.measures, [m](const MeasureTerm& term) { return term.index == m; });
    });
    const auto isSame = [&](std::size_t other) { return isSamePair(measures[m], measures[other]); };
    if (isCounted && std::ranges::none_of(found, isSame)) found.push_back(m);
  }
  return found;
}

void readDreamSection(const SetupSection& section, std::span<const OutputMeasure> measures,
                      std::span<const ObjectiveFunction> objectives, DreamSection& settings) {
  constexpr std::size_t kMostMeasures = 10'000;
  const SetupSection dream = section.open("DREAM");
  dream.read(dreamSection(), settings);
  settings.place = dream.location(kLikelihoodKeyword);
  checkTerms(dream, settings.errors);
  const std::vector<std::size_t> compared = measuresOfLikelihood(measures, objectives);
  if (settings.objectiveName) {
    settings.objective = numberOfObjective(dream, *settings.objectiveName, objectives);
  }
  checkDream(dream, settings, objectives.size(), !compared.empty());
  const LikelihoodForm form = *settings.errors.form;
  ErrorModels models{{form, &settings.errors}};
  for (std::size_t n = 1; n <= kMostMeasures; ++n) {
    if (!dream.has(fmt::format("{}{}", kErrorModelPrefix, n))) continue;
    const SetupSection own = dream.openItem(kErrorModelPrefix, n);
    ErrorModelSettings& model = settings.own[n];
    own.read(errorModelSection(), model);
    checkTerms(own, model);
    if (form == LikelihoodForm::objective) {
      own.refuse(kErrorModelRefusal, kLikelihoodKeyword,
                 fmt::format("the likelihood of DREAM is an objective function, which has no errors of series to "
                             "describe: remove the section {}",
                             own.name()));
    }
    if (model.form == LikelihoodForm::objective) {
      own.refuse(kErrorModelRefusal, kLikelihoodKeyword,
                 fmt::format("expected how the errors of the series are distributed, found '{}': an objective function "
                             "can only be the whole likelihood, that of DREAM",
                             nameOf(*model.form)));
    }
    if (std::ranges::find(compared, n - 1) == compared.end()) {
      dream.refuse(kDreamLikelihoodRefusal, fmt::format("{}{}", kErrorModelPrefix, n), std::string(kErrorModelMeasure));
    }
    models.emplace_back(model.form.value_or(form), &model);
    refuseUnread(own, model, settings.errors, {models.back()});
  }
  refuseUnread(dream, settings.errors, settings.errors, models);
}

}  // namespace mirevo

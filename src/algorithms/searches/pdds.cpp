#include "algorithms/searches/pdds.h"

namespace mirevo {

namespace {

/// Twice the slots of a usual machine, and few enough for a budget of some hundred evaluations.
constexpr int kUsualCandidates = 16;

}  // namespace

PddsMethod::PddsMethod() {
  settings.candidates = kUsualCandidates;
  settings.waitsForAll = false;
}

const SearchFacts& PddsMethod::facts() const {
  static constexpr SearchFacts kFacts{
      .name = {std::nullopt, "PDDS"}, .longName = "Parallel Dynamically Dimensioned Search", .runsInParallel = true};
  return kFacts;
}

BoundSection PddsMethod::section() {
  static const SettingSection<PddsMethod> section{
      {"OPTIMISATION_ALGORITHM/PDDS_CONTROL_PARAMETERS",
       "when `Algorithm_Type` is `'PDDS'`",
       "Parallel Dynamically Dimensioned Search.",
       {setting<PddsMethod>([](auto& m) -> auto& { return m.settings.perturbation; },
                            {.name = kPerturbationKeyword,
                             .defaultValue = "0.2",
                             .range = kFraction,
                             .refusal = "Error: Perturbation parameter in PDDS algorithm invalid",
                             .meaning = std::string(kPerturbationMeaning)}),
        setting<PddsMethod>([](auto& m) -> auto& { return m.settings.candidates; },
                            {.name = "Candidates",
                             .defaultValue = "16",
                             .range = from(1),
                             .refusal = "Error: No. of candidates in PDDS algorithm invalid",
                             .meaning = "Candidates at a time, k: as many evaluations as slots or ranks can work on. "
                                        "Twice the number of slots keeps them busy, four times if run times differ "
                                        "much. Another k is another search; the number of slots makes no difference "
                                        "to it."}),
        setting<PddsMethod>([](auto& m) -> auto& { return m.settings.waitsForAll; },
                            {.name = "Wait_For_All",
                             .defaultValue = "0",
                             .meaning = "0: as soon as the first of the k candidates under way has its result, the "
                                        "next one is made. 1: k candidates are made in one step from the same best "
                                        "set, and all must have their results before the next step."})}}};
  return {section, *this};
}

std::string_view PddsMethod::budgetRefusal() const {
  return "Error: Maximum No. of model evaluations in PDDS algorithm invalid";
}

}  // namespace mirevo

#include "algorithms/searches/opse.h"

#include <utility>

namespace mirevo {

Opse::Opse(const OpseSettings& settings, const SimplexSettings& simplex, SearchProblem problem)
    : PseMoves(settings, simplex, std::move(problem)), settings_(settings) {}

void Opse::makeLoop() {
  if (seats_.empty()) seatPopulation();
  for (std::size_t taken = 0; taken < population_.size(); ++taken) {
    fillWindow();
    if (inFlight_.empty()) return;
    takeFirst();
  }
}

void Opse::finish() {
  while (!inFlight_.empty()) takeFirst();
}

void Opse::seatPopulation() {
  for (std::size_t place = 0; place < population_.size(); ++place) {
    seats_.push_back({place});
    seatAt_.push_back(place);
  }
}

void Opse::fillWindow() {
  while (inFlight_.size() < static_cast<std::size_t>(settings_.setsInFlight) && setsLeft() > 0) {
    const std::size_t seat = nextParent();
    inFlight_.push_back({makeOffspring(seats_[seat].place), seat, seats_[seat].replacements});
    submit(inFlight_.back().child.set);
  }
}

std::size_t Opse::nextParent() {
  if (parents_.empty()) {
    for (const std::size_t place : chooseParents()) parents_.push_back(seatAt_[place]);
  }
  const std::size_t seat = parents_.front();
  parents_.pop_front();
  return seat;
}

void Opse::takeFirst() {
  EvaluationResult result = awaitFirst();
  InFlight first = std::move(inFlight_.front());
  inFlight_.pop_front();
  Seat& seat = seats_[first.seat];
  first.child.parent = seat.place;
  if (!settle(first.child, std::move(result), seat.replacements != first.replacements)) return;
  ++seat.replacements;
  moveToItsPlace(seat.place);
}

/// Keeps the population sorted as sortBestFirst() would: a new point is behind those of equal value.
void Opse::moveToItsPlace(std::size_t place) {
  const auto isBefore = [this](std::size_t a, std::size_t b) {
    return isBetter(population_[a].value(), population_[b].value());
  };
  for (; place > 0 && isBefore(place, place - 1); --place) swapPlaces(place, place - 1);
  for (; place + 1 < population_.size() && isBefore(place + 1, place); ++place) swapPlaces(place, place + 1);
}

void Opse::swapPlaces(std::size_t a, std::size_t b) {
  std::swap(population_[a], population_[b]);
  std::swap(seatAt_[a], seatAt_[b]);
  seats_[seatAt_[a]].place = a;
  seats_[seatAt_[b]].place = b;
}

constexpr PseRefusals OpseMethod::kRefusals{
    .population = "Error: Population size in OPSE algorithm invalid",
    .simplex = "Error: No. of points in a simplex in OPSE algorithm invalid",
    .reflection = "Error: Probability for reflection step in OPSE algorithm invalid",
    .contraction = "Error: Probability for contraction step in OPSE algorithm invalid",
    .expansion = "Error: Probability for expansion step in OPSE algorithm invalid",
    .sum = "Error: Sum of probabilities for reflection and contraction in OPSE algorithm larger than 1"};

const SearchFacts& OpseMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {std::nullopt, "OPSE"},
                                      .longName = "Overlapping Population Simplex Evolution",
                                      .runsInParallel = true,
                                      .drawsInitialSample = true,
                                      .needsRanges = true,
                                      .populationKeywords = kPopulationKeyword};
  return kFacts;
}

BoundSection OpseMethod::section() {
  static const SettingSection<OpseMethod> section = [] {
    SettingSection<OpseMethod> made{{"OPTIMISATION_ALGORITHM/OPSE_CONTROL_PARAMETERS",
                                     "when `Algorithm_Type` is `'OPSE'`", "Overlapping Population Simplex Evolution.",
                                     pseKeywordRows<OpseMethod>()}};
    made.row.keywords.push_back(setting<OpseMethod>(
        [](auto& m) -> auto& { return m.settings.setsInFlight; },
        {.name = "Sets_In_Flight",
         .range = from(1),
         .refusal = "Error: No. of sets in flight in OPSE algorithm invalid",
         .unit = "model runs",
         .meaning =
             "Model runs under way or waiting for a slot: a set is proposed from the results of all sets up to so "
             "many before it, whatever the number of slots. Up to half of the population costs no evaluations. "
             "Slots are filled by as many where all runs take equally long, by four to five times as many where "
             "their times vary as widely as exponential ones."}));
    return made;
  }();
  return {section, *this};
}

std::vector<SearchAdvice> OpseMethod::advice(std::size_t n) const {
  return pseAdvice(settings.populationSize, simplex.pointCount, n);
}

std::unique_ptr<SearchAlgorithm> OpseMethod::make(SearchProblem problem) const {
  return std::make_unique<Opse>(settings, simplex, std::move(problem));
}

}  // namespace mirevo

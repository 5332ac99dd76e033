/// Prints what the searches need on the catchments of the examples: the tables of docs/algorithms/which-search.md. The
/// models run inside this program, with parameters, bounds, scales and years of the setups. Usage: catchment_search
/// STAGED_EXAMPLES [piscataquis | sitter [seeds [search]]], the folder being examples/ in a build folder, where the
/// targets example_piscataquis and example_sitter put data; 100 seeds and all searches, "GLM" and "SCE" among them,
/// unless it says otherwise.

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "glm_trials.h"
#include "models/gr4j_cemaneige.h"
#include "models/model_files.h"
#include "models/muskingum.h"
#include "trials.h"

namespace mirevo {
namespace {

using namespace bench;

struct Days {
  std::vector<std::string> dates;
  std::vector<models::Forcing> forcing;
  double annualSnowfall = 0.0;  ///< mm, of the whole file
};

/// The days up to `last`: of those that follow, a model knows the annual snowfall alone.
Days readForcing(const std::string& name, std::string_view last) {
  models::CsvFile file(name);
  const bool meanOnly = file.hasColumn("temperature_degC");
  Days days;
  while (file.nextRow()) {
    const auto number = [&file](std::string_view column) { return file.number(file.column(column)); };
    const double least = number(meanOnly ? "temperature_degC" : "tmin_degC");
    const double largest = meanOnly ? least : number("tmax_degC");
    days.dates.emplace_back(file.text(file.column("time")).substr(0, 10));
    days.forcing.push_back(
        {number("precipitation_mm"), number("pet_mm"), 0.5 * (least + largest),
         meanOnly ? models::solidFractionOfMean(least) : models::solidFractionOfRange(least, largest)});
  }
  days.annualSnowfall = models::meanAnnualSolidPrecipitation(days.forcing);
  const auto end = std::upper_bound(days.dates.begin(), days.dates.end(), last);
  days.forcing.resize(static_cast<std::size_t>(end - days.dates.begin()));
  days.dates.erase(end, days.dates.end());
  return days;
}

/// The observed values of the days, in which the file has the same order.
std::vector<double> readObserved(const std::string& name, std::string_view column) {
  models::CsvFile file(name);
  std::vector<double> values;
  while (file.nextRow()) values.push_back(file.number(file.column(column)));
  return values;
}

/// Root mean square error in the years from `first` to `last`; -999 is a gap.
double errorOf(const std::vector<double>& simulated, const std::vector<double>& observed, const Days& days,
               std::string_view first, std::string_view last) {
  double sum = 0.0;
  int count = 0;
  for (std::size_t i = 0; i < simulated.size() && i < observed.size(); ++i) {
    if (days.dates[i] < first || days.dates[i] > last || observed[i] < -998.0) continue;
    sum += (simulated[i] - observed[i]) * (simulated[i] - observed[i]);
    ++count;
  }
  return std::sqrt(sum / count);
}

std::vector<double> discharge(const models::Parameters& parameters, const Days& days, double areaKm2) {
  std::vector<double> flows;
  models::SnowPack snow(parameters, days.annualSnowfall);
  models::Gr4j river(parameters);
  for (const models::Forcing& day : days.forcing) {
    flows.push_back(river.advance(snow.advance(day), day.pet).runoff * areaKm2 / 86.4);
  }
  return flows;
}

struct Catchment {
  TestFunction function;
  Residuals residuals;  ///< the sum of their squares is that of the squared terms of the aggregate
};

/// Appends the differences in the years from `first` to `last`, divided by `divisor` and the root of their number.
void appendResiduals(const std::vector<double>& simulated, const std::vector<double>& observed, const Days& days,
                     std::string_view first, std::string_view last, double divisor, std::vector<double>& residuals) {
  const std::size_t begin = residuals.size();
  for (std::size_t i = 0; i < simulated.size() && i < observed.size(); ++i) {
    if (days.dates[i] < first || days.dates[i] > last || observed[i] < -998.0) continue;
    residuals.push_back((simulated[i] - observed[i]) / divisor);
  }
  const double root = std::sqrt(static_cast<double>(residuals.size() - begin));
  for (std::size_t i = begin; i < residuals.size(); ++i) residuals[i] /= root;
}

/// A target that a search is to reach: optimalValue is a tolerance below it.
TestFunction searched(const std::vector<std::pair<double, double>>& bounds, double target,
                      std::function<double(const std::vector<double>&)> value) {
  TestFunction function;
  for (const auto& [lower, upper] : bounds) {
    function.lower.push_back(lower);
    function.upper.push_back(upper);
  }
  function.optimalValue = target - 1.0e-3;
  function.value = std::move(value);
  return function;
}

/// Six parameters; the error of the discharge in m3/s, of which the best known value is 11.666.
Catchment piscataquis(const std::string& folder) {
  constexpr std::string_view kLastDay = "1990-09-30";
  const Days days = readForcing(folder + "/model/forcing.csv", kLastDay);
  const std::vector<double> observed = readObserved(folder + "/data/discharge.csv", "discharge_m3s");
  const auto flow = [days](const std::vector<double>& x) {
    return discharge({std::exp(x[0]), x[1], std::exp(x[2]), x[3], x[4], x[5]}, days, 771.486538);
  };
  return {
      searched(
          {{std::log(50.0), std::log(2000.0)}, {-5, 5}, {std::log(10.0), std::log(500.0)}, {0.5, 5}, {0, 1}, {1, 10}},
          11.75,
          [=](const std::vector<double>& x) { return errorOf(flow(x), observed, days, "1981-10-01", kLastDay); }),
      [=](const std::vector<double>& x) {
        std::vector<double> residuals;
        appendResiduals(flow(x), observed, days, "1981-10-01", kLastDay, 1.0, residuals);
        return residuals;
      }};
}

/// Eleven parameters; the errors of both gauges, each divided by the standard deviation that docs/examples/sitter.md
/// has.
Catchment sitter(const std::string& folder, double target) {
  constexpr std::string_view kLastDay = "1992-09-30";
  const Days upper = readForcing(folder + "/model/upper_forcing.csv", kLastDay);
  const Days lower = readForcing(folder + "/model/lower_forcing.csv", kLastDay);
  const std::vector<double> appenzell = readObserved(folder + "/data/discharge.csv", "appenzell_m3s");
  const std::vector<double> stGallen = readObserved(folder + "/data/discharge.csv", "st_gallen_m3s");
  constexpr double kAppenzellScale = 1.0510299772763;
  constexpr double kStGallenScale = 2.75310188505;
  const std::pair<double, double> x1{std::log(20.0), std::log(2000.0)};
  const std::pair<double, double> x3{std::log(5.0), std::log(500.0)};
  struct Flows {
    std::vector<double> appenzell;
    std::vector<double> stGallen;
  };
  const auto flows = [upper, lower](const std::vector<double>& x) {
    const models::Parameters above{std::exp(x[0]), x[1], std::exp(x[2]), x[3], x[8], x[9]};
    const models::Parameters below{std::exp(x[4]), x[5], std::exp(x[6]), x[7], x[8], x[9]};
    Flows found{discharge(above, upper, 74.4), discharge(below, lower, 186.6)};
    models::MuskingumRiver river(std::exp(x[10]), 0.2);
    for (std::size_t i = 0; i < found.stGallen.size(); ++i) found.stGallen[i] += river.advance(found.appenzell[i]);
    return found;
  };
  return {
      searched({x1, {-5, 5}, x3, {0.5, 4}, x1, {-5, 5}, x3, {0.5, 4}, {0, 1}, {1, 10}, {std::log(0.02), 0.0}}, target,
               [=](const std::vector<double>& x) {
                 const Flows found = flows(x);
                 return errorOf(found.appenzell, appenzell, upper, "1982-10-01", kLastDay) / kAppenzellScale +
                        errorOf(found.stGallen, stGallen, upper, "1982-10-01", kLastDay) / kStGallenScale;
               }),
      [=](const std::vector<double>& x) {
        const Flows found = flows(x);
        std::vector<double> residuals;
        appendResiduals(found.appenzell, appenzell, upper, "1982-10-01", kLastDay, kAppenzellScale, residuals);
        appendResiduals(found.stGallen, stGallen, upper, "1982-10-01", kLastDay, kStGallenScale, residuals);
        return residuals;
      }};
}

void printRow(std::string_view name, const std::vector<Outcome>& outcomes,
              const std::vector<std::vector<double>>& best) {
  fmt::print("| {} | {} |", name, successText(outcomes));
  for (const std::vector<double>& values : best) fmt::print(" {:.4f} |", medianOf(values));
  fmt::print("\n");
  std::fflush(stdout);
}

/// The best values after each of the checkpoints.
std::vector<std::vector<double>> bestValues(const std::vector<Outcome>& outcomes, std::size_t checkpoints) {
  std::vector<std::vector<double>> best(checkpoints);
  for (const Outcome& outcome : outcomes) {
    for (std::size_t i = 0; i < checkpoints; ++i) best[i].push_back(outcome.bestAfter[i]);
  }
  return best;
}

void printGlm(const Catchment& catchment, const std::vector<int>& budgets, int seeds) {
  const std::vector<std::pair<std::string_view, GlmSettings>> searches = {
      {"GLM, 20 sets, 10 starts", {.sampleSize = 20, .startCount = 10}},
      {"GLM, no Broyden updates", {.broydenUpdates = 0, .sampleSize = 20, .startCount = 10}},
      {"GLM, no Broyden updates, steps of 0.001",
       {.perturbationFraction = 0.001, .broydenUpdates = 0, .sampleSize = 20, .startCount = 10}}};
  const Setting setting{.budget = budgets.back(), .checkpoints = budgets};
  for (const auto& [name, settings] : searches) {
    std::vector<Outcome> outcomes;
    for (int seed = 1; seed <= seeds; ++seed) {
      outcomes.push_back(runGlmTrial(catchment.function, catchment.residuals, settings, setting, seed));
    }
    printRow(name, outcomes, bestValues(outcomes, budgets.size()));
  }
}

/// The steps of DDS and PDDS depend on the budget: each has searches of its own.
void printByBudget(const TestFunction& function, std::string_view name, Setting setting,
                   const std::vector<int>& budgets, int seeds) {
  std::vector<std::vector<double>> best;
  std::vector<Outcome> outcomes;
  for (const int budget : budgets) {
    setting.budget = budget;
    outcomes = runTrials(function, setting, false, seeds);
    std::vector<double>& values = best.emplace_back();
    for (const Outcome& outcome : outcomes) values.push_back(outcome.best);
  }
  printRow(name, outcomes, best);
}

void print(const Catchment& catchment, std::string_view search, const std::vector<int>& budgets, int seeds) {
  const TestFunction& function = catchment.function;
  const int twice = 2 * static_cast<int>(cmaPopulationSize(function.size()));
  const std::vector<std::pair<std::string_view, Setting>> searches = {
      {"CMA-ES", {.method = Method::cma}},
      {"CMA-ES, twice the population", {.method = Method::cma, .cma = {.populationSize = twice}}},
      {"CMA-ES, Gaussian process", {.method = Method::cma, .samplingRate = 25, .modelType = kGaussian}},
      {"SCE", {.method = Method::sce, .complexes = 4}},
      {"SCE, Gaussian process", {.method = Method::sce, .complexes = 4, .samplingRate = 25, .modelType = kGaussian}},
      {"PSE", {.method = Method::pse, .complexes = 4}},
      {"DDS", {.method = Method::dds}},
      {"PDDS", {.method = Method::dds, .dds = {.candidates = 16, .waitsForAll = false}}}};
  fmt::print("\n| search | successes of {} / mean evaluations with {} |", seeds, budgets.back());
  for (const int budget : budgets) fmt::print(" median after {} |", budget);
  fmt::print("\n|---|---|");
  for (std::size_t i = 0; i < budgets.size(); ++i) fmt::print("---|");
  fmt::print("\n");
  if (search.empty() || search == "GLM") printGlm(catchment, budgets, seeds);
  for (auto [name, setting] : searches) {
    if (!search.empty() && search != name) continue;
    setting.budget = budgets.back();
    if (setting.method == Method::dds) {
      printByBudget(function, name, setting, budgets, seeds);
      continue;
    }
    setting.checkpoints = budgets;
    const std::vector<Outcome> outcomes = runTrials(function, setting, false, seeds);
    printRow(name, outcomes, bestValues(outcomes, budgets.size()));
  }
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  if (argc < 2) return 1;
  const std::string folder = argv[1];
  const std::string which = argc > 2 ? argv[2] : "";
  const int seeds = argc > 3 ? std::atoi(argv[3]) : 100;
  const std::string search = argc > 4 ? argv[4] : "";
  if (which.empty() || which == "piscataquis") {
    fmt::print("\nPiscataquis, 6 parameters, target 11.75 m3/s\n");
    mirevo::print(mirevo::piscataquis(folder + "/piscataquis"), search, {300, 500, 900}, seeds);
  }
  if (which.empty() || which == "sitter") {
    constexpr double kTarget = 3.72;
    fmt::print("\nSitter, 11 parameters, target {}\n", kTarget);
    mirevo::print(mirevo::sitter(folder + "/sitter", kTarget), search, {300, 500, 1000, 2000}, seeds);
  }
  return 0;
}

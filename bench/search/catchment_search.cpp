/// Prints what the searches need on the catchments of the examples: the tables of docs/algorithms/which-search.md. The
/// models run inside this program, with parameters, bounds, scales and years of the setups. Usage: catchment_search
/// STAGED_EXAMPLES [piscataquis | sitter], the folder being examples/ in a build folder, where the targets
/// example_piscataquis and example_sitter put data.

#include <cmath>
#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/format.h>

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
};

Days readForcing(const std::string& name) {
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
  for (const models::DailyResult& day : models::simulate(parameters, days.forcing)) {
    flows.push_back(day.runoff * areaKm2 / 86.4);
  }
  return flows;
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
TestFunction piscataquis(const std::string& folder) {
  const Days days = readForcing(folder + "/model/forcing.csv");
  const std::vector<double> observed = readObserved(folder + "/data/discharge.csv", "discharge_m3s");
  return searched(
      {{std::log(50.0), std::log(2000.0)}, {-5, 5}, {std::log(10.0), std::log(500.0)}, {0.5, 5}, {0, 1}, {1, 10}},
      11.75, [days, observed](const std::vector<double>& x) {
        const models::Parameters p{std::exp(x[0]), x[1], std::exp(x[2]), x[3], x[4], x[5]};
        return errorOf(discharge(p, days, 771.486538), observed, days, "1981-10-01", "1990-09-30");
      });
}

/// Eleven parameters; the errors of both gauges, each divided by the standard deviation that docs/examples/sitter.md
/// has.
TestFunction sitter(const std::string& folder, double target) {
  const Days upper = readForcing(folder + "/model/upper_forcing.csv");
  const Days lower = readForcing(folder + "/model/lower_forcing.csv");
  const std::vector<double> appenzell = readObserved(folder + "/data/discharge.csv", "appenzell_m3s");
  const std::vector<double> stGallen = readObserved(folder + "/data/discharge.csv", "st_gallen_m3s");
  const std::pair<double, double> x1{std::log(20.0), std::log(2000.0)};
  const std::pair<double, double> x3{std::log(5.0), std::log(500.0)};
  return searched({x1, {-5, 5}, x3, {0.5, 4}, x1, {-5, 5}, x3, {0.5, 4}, {0, 1}, {1, 10}, {std::log(0.02), 0.0}},
                  target, [upper, lower, appenzell, stGallen](const std::vector<double>& x) {
                    const models::Parameters above{std::exp(x[0]), x[1], std::exp(x[2]), x[3], x[8], x[9]};
                    const models::Parameters below{std::exp(x[4]), x[5], std::exp(x[6]), x[7], x[8], x[9]};
                    const std::vector<double> flow = discharge(above, upper, 74.4);
                    std::vector<double> joined = discharge(below, lower, 186.6);
                    models::MuskingumRiver river(std::exp(x[10]), 0.2);
                    for (std::size_t i = 0; i < joined.size(); ++i) joined[i] += river.advance(flow[i]);
                    return errorOf(flow, appenzell, upper, "1982-10-01", "1992-09-30") / 1.0510299772763 +
                           errorOf(joined, stGallen, upper, "1982-10-01", "1992-09-30") / 2.75310188505;
                  });
}

void print(const TestFunction& function, const std::vector<int>& budgets, int successBudget, int seeds) {
  const std::vector<std::pair<std::string_view, Setting>> searches = {
      {"CMA-ES", {.method = Method::cma}},
      {"CMA-ES, twice the population",
       {.method = Method::cma, .cma = {.populationSize = 2 * static_cast<int>(cmaPopulationSize(function.size()))}}},
      {"SCE", {.method = Method::sce, .complexes = 4}},
      {"PSE", {.method = Method::pse, .complexes = 4}},
      {"DDS", {.method = Method::dds}},
      {"PDDS", {.method = Method::dds, .dds = {.candidates = 16, .waitsForAll = false}}}};
  fmt::print("\n| search | successes of {} / mean evaluations with {} |", seeds, successBudget);
  for (const int budget : budgets) fmt::print(" median after {} |", budget);
  fmt::print("\n|---|---|");
  for (std::size_t i = 0; i < budgets.size(); ++i) fmt::print("---|");
  fmt::print("\n");
  for (auto [name, setting] : searches) {
    setting.budget = successBudget;
    setting.stopsAtTarget = true;
    fmt::print("| {} | {} |", name, successText(runTrials(function, setting, false, seeds)));
    setting.stopsAtTarget = false;
    for (const int budget : budgets) {
      setting.budget = budget;
      fmt::print(" {:.4f} |", medianOf(runTrials(function, setting, false, seeds)));
    }
    fmt::print("\n");
    std::fflush(stdout);
  }
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  if (argc < 2) return 1;
  const std::string folder = argv[1];
  const std::string which = argc > 2 ? argv[2] : "";
  if (which.empty() || which == "piscataquis") {
    fmt::print("\nPiscataquis, 6 parameters, target 11.75 m3/s\n");
    mirevo::print(mirevo::piscataquis(folder + "/piscataquis"), {300, 500, 900}, 900, 20);
  }
  if (which.empty() || which == "sitter") {
    constexpr double kTarget = 3.72;
    fmt::print("\nSitter, 11 parameters, target {}\n", kTarget);
    mirevo::print(mirevo::sitter(folder + "/sitter", kTarget), {}, 2000, 10);
  }
  return 0;
}

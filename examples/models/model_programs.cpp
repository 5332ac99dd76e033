#include "models/model_programs.h"

#include <vector>

#include "models/gr4j_cemaneige.h"
#include "models/model_files.h"
#include "models/muskingum.h"

namespace models {
namespace {

struct Series {
  std::vector<std::string> times;
  std::vector<Forcing> days;
};

/// Reads the days from `start` to `end`, both included.
Series readForcing(const std::string& name, const std::string& start, const std::string& end) {
  CsvFile file(name);
  const std::size_t time = file.column("time");
  const std::size_t precipitation = file.column("precipitation_mm");
  const std::size_t pet = file.column("pet_mm");
  const bool meanOnly = file.hasColumn("temperature_degC");
  const std::size_t lowest = file.column(meanOnly ? "temperature_degC" : "tmin_degC");
  const std::size_t highest = meanOnly ? lowest : file.column("tmax_degC");

  Series series;
  while (file.nextRow()) {
    const std::string_view day = file.text(time).substr(0, 10);
    if (day < start || day > end) continue;
    const double tmin = file.number(lowest);
    const double tmax = meanOnly ? tmin : file.number(highest);
    const Forcing forcing{file.number(precipitation), file.number(pet), meanOnly ? tmin : 0.5 * (tmin + tmax),
                          meanOnly ? solidFractionOfMean(tmin) : solidFractionOfRange(tmin, tmax)};
    if (forcing.precipitation < 0.0 || forcing.pet < 0.0) {
      fail(file.place() + ": precipitation and pet cannot be negative");
    }
    if (tmin > tmax) fail(file.place() + ": tmin is above tmax");
    series.times.emplace_back(file.text(time));
    series.days.push_back(forcing);
  }
  if (series.days.empty()) fail(name + ": no day from " + start + " to " + end);
  return series;
}

}  // namespace

void runCatchment(const std::string& parameterName, const std::string& forcingName, const std::string& simulatedName) {
  ParameterFile file(parameterName);
  Parameters parameters;
  parameters.x1 = file.number("X1", 1.0e-2, 1.0e5);
  parameters.x2 = file.number("X2", -1.0e3, 1.0e3);
  parameters.x3 = file.number("X3", 1.0e-2, 1.0e5);
  parameters.x4 = file.number("X4", 1.0e-2, 1.0e2);
  parameters.ctg = file.number("CTG", 0.0, 1.0);
  parameters.kf = file.number("Kf", 0.0, 1.0e2);
  const double areaKm2 = file.number("area_km2", 1.0e-6, 1.0e7);
  const std::string start = file.date("start", "0000-00-00");
  const std::string end = file.date("end", "9999-99-99");
  file.checkAllTaken();

  const Series series = readForcing(forcingName, start, end);
  const std::vector<DailyResult> results = simulate(parameters, series.days);

  const double m3sPerMm = areaKm2 * 1.0e6 * 1.0e-3 / 86400.0;
  std::string text(kCatchmentHeader);
  text.reserve(results.size() * 64);
  for (std::size_t i = 0; i < results.size(); ++i) {
    text += series.times[i];
    appendNumber(text, results[i].runoff * m3sPerMm);
    appendNumber(text, results[i].snowWater);
    appendNumber(text, results[i].productionStore);
    appendNumber(text, results[i].evapotranspiration);
    text += '\n';
  }
  writeFile(simulatedName, text);
}

void runRiver(const std::string& parameterName, const std::string& upstreamName, const std::string& lateralName,
              const std::string& simulatedName) {
  ParameterFile file(parameterName);
  const double k = file.number("K", 1.0e-2, 1.0e2);
  const double x = file.number("X", 0.0, 0.49);
  file.checkAllTaken();

  MuskingumRiver river(k, x);
  CsvFile upstream(upstreamName);
  CsvFile lateral(lateralName);
  const std::size_t upstreamTime = upstream.column("time");
  const std::size_t upstreamFlow = upstream.column("discharge_m3s");
  const std::size_t lateralTime = lateral.column("time");
  const std::size_t lateralFlow = lateral.column("discharge_m3s");
  std::string text(kRiverHeader);
  while (upstream.nextRow()) {
    const std::string_view time = upstream.text(upstreamTime);
    if (!lateral.nextRow()) fail(lateralName + ": ends before " + std::string(time));
    if (lateral.text(lateralTime) != time) fail(lateral.place() + ": expected the day " + std::string(time));
    const double routed = river.advance(upstream.number(upstreamFlow));
    const double joining = lateral.number(lateralFlow);
    text += time;
    appendNumber(text, routed + joining);
    appendNumber(text, routed);
    appendNumber(text, joining);
    text += '\n';
  }
  if (lateral.nextRow()) fail(lateral.place() + ": is a day that " + upstreamName + " does not have");
  writeFile(simulatedName, text);
}

}  // namespace models

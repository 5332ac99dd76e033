// A daily rainfall-runoff model in one file: GR4J with the CemaNeige snow module.
//
//   gr4j_cemaneige PARAMETER_FILE FORCING_CSV SIMULATED_CSV
//
// GR4J (four parameters) after
//   Perrin, C., Michel, C., Andréassian, V. (2003): Improvement of a parsimonious model for streamflow simulation.
//   Journal of Hydrology 279, 275-289. doi:10.1016/S0022-1694(03)00225-7  -- "Perrin" in the comments below.
// CemaNeige (two parameters) after
//   Valéry, A., Andréassian, V., Perrin, C. (2014): 'As simple as possible but not simpler': What is useful in a
//   temperature-based snow-accounting routine? Part 2. Journal of Hydrology 517, 1176-1187.
//   doi:10.1016/j.jhydrol.2014.04.059  -- "Valéry" below.
//
// The snow module has one band and not the usual five: the forcing is a mean over the catchment, and without the
// catchment's distribution of altitudes there is nothing to tell five bands apart by.
//
// PARAMETER_FILE holds lines `name = value`, `#` begins a comment:
//   X1, X2, X3, X4   GR4J: production store [mm], exchange [mm/d], routing store [mm], unit hydrograph time base [d]
//   CTG, Kf          CemaNeige: weight of the pack's past temperature [-], degree-day factor [mm/degC/d]
//   area_km2         catchment area
//   start, end       first and last day to simulate (2001-01-31); optional, else the whole forcing
// FORCING_CSV has the columns time, precipitation_mm, pet_mm, tmin_degC and tmax_degC, in any order, one row a day.
// SIMULATED_CSV gets the columns of kOutputHeader; it appears under its name only when it is complete.
//
// Exit code: 0, or 1 with one line of explanation on standard error.

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <exception>
#include <fstream>
#include <iterator>
#include <map>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

namespace gr4j {

/// One day over the catchment.
struct Forcing {
  double precipitation = 0.0;  ///< mm/d
  double pet = 0.0;            ///< potential evapotranspiration, mm/d
  double tmin = 0.0;           ///< degC
  double tmax = 0.0;           ///< degC
};

struct Parameters {
  double x1 = 350.0;  ///< capacity of the production store, mm, > 0
  double x2 = 0.0;    ///< groundwater exchange coefficient, mm/d, either sign
  double x3 = 90.0;   ///< one day ahead capacity of the routing store, mm, > 0
  double x4 = 1.7;    ///< time base of the first unit hydrograph, d, > 0
  double ctg = 0.25;  ///< weight of yesterday's thermal state of the snow pack, 0..1
  double kf = 4.0;    ///< degree-day melt factor, mm/degC/d, >= 0
};

/// Share of a day's precipitation that falls as snow, 0..1 (Valéry's choice for catchments below 1500 m): all of it on
/// a day without thaw, none on a day without frost, between the two as much as the day is below zero.
inline double solidFraction(double tmin, double tmax) {
  if (tmax <= 0.0) return 1.0;
  if (tmin >= 0.0) return 0.0;
  return 1.0 - tmax / (tmax - tmin);
}

/// CemaNeige for one band.
class SnowPack {
 public:
  /// `meanAnnualSolidPrecipitation` in mm; 90 % of it is the pack from which on the whole area is taken as covered.
  SnowPack(const Parameters& parameters, double meanAnnualSolidPrecipitation)
      : ctg_(parameters.ctg), kf_(parameters.kf), fullCover_(0.9 * meanAnnualSolidPrecipitation) {}

  /// Takes a day's weather and gives the water that reaches the ground, rain and melt, mm.
  double advance(const Forcing& day) {
    const double solid = day.precipitation * solidFraction(day.tmin, day.tmax);
    const double rain = day.precipitation - solid;
    const double temperature = 0.5 * (day.tmin + day.tmax);
    water_ += solid;
    // Thermal state of the pack: eTG = min(0, CTG eTG + (1 - CTG) T).
    thermalState_ = std::min(0.0, ctg_ * thermalState_ + (1.0 - ctg_) * temperature);
    // A pack at 0 degC melts by Kf (T - 0 degC), as far as there is any.
    double potentialMelt = 0.0;
    if (thermalState_ == 0.0 && temperature > 0.0) potentialMelt = std::min(water_, kf_ * temperature);
    // Melt slows down to a tenth as the cover becomes patchy: (0.9 G/Gthreshold + 0.1) of the potential.
    const double cover = water_ < fullCover_ ? water_ / fullCover_ : 1.0;
    const double melt = ((1.0 - kMinimumMeltSpeed) * cover + kMinimumMeltSpeed) * potentialMelt;
    water_ -= melt;
    return rain + melt;
  }

  double water() const { return water_; }  ///< snow water equivalent, mm
  double thermalState() const { return thermalState_; }

 private:
  static constexpr double kMinimumMeltSpeed = 0.1;
  double ctg_;
  double kf_;
  double fullCover_;           ///< Gthreshold, mm
  double water_ = 0.0;         ///< G, mm
  double thermalState_ = 0.0;  ///< eTG, degC, <= 0
};

/// S-curve of the first unit hydrograph, base X4 (Perrin eqs. 9-11).
inline double sCurve1(double t, double x4) {
  if (t <= 0.0) return 0.0;
  return t < x4 ? std::pow(t / x4, 2.5) : 1.0;
}

/// S-curve of the second, base 2 X4 (Perrin eqs. 12-15).
inline double sCurve2(double t, double x4) {
  if (t <= 0.0) return 0.0;
  if (t <= x4) return 0.5 * std::pow(t / x4, 2.5);
  return t < 2.0 * x4 ? 1.0 - 0.5 * std::pow(2.0 - t / x4, 2.5) : 1.0;
}

/// Spreads each day's water over the days to come. Its ordinates are the differences of an S-curve at whole days
/// (Perrin eqs. 16, 17); they sum to 1.
class UnitHydrograph {
 public:
  UnitHydrograph(double (*sCurve)(double, double), double x4, double timeBase) {
    const int days = std::max(1, static_cast<int>(std::ceil(timeBase)));
    for (int day = 1; day <= days; ++day) ordinates_.push_back(sCurve(day, x4) - sCurve(day - 1, x4));
    onTheWay_.assign(ordinates_.size(), 0.0);
  }

  /// Adds today's water and gives what arrives today, mm.
  double advance(double water) {
    for (std::size_t day = 0; day < ordinates_.size(); ++day) onTheWay_[day] += ordinates_[day] * water;
    const double arriving = onTheWay_.front();
    std::rotate(onTheWay_.begin(), onTheWay_.begin() + 1, onTheWay_.end());
    onTheWay_.back() = 0.0;
    return arriving;
  }

  std::span<const double> ordinates() const { return ordinates_; }
  double stored() const {  ///< mm still under way
    double sum = 0.0;
    for (const double water : onTheWay_) sum += water;
    return sum;
  }

 private:
  std::vector<double> ordinates_;
  std::vector<double> onTheWay_;  ///< mm, entry 0 arrives today
};

/// What one day did, mm.
struct Fluxes {
  double runoff = 0.0;              ///< Q
  double evapotranspiration = 0.0;  ///< actual, interception included
  double exchange = 0.0;            ///< gained from (> 0) or lost to (< 0) the groundwater
};

/// x (1 - (1 + (ratio)^4)^(-1/4)): what leaves a store of content x, of both percolation and routing.
inline double storeOutflow(double content, double ratio) {
  const double squared = ratio * ratio;
  return content * (1.0 - 1.0 / std::sqrt(std::sqrt(1.0 + squared * squared)));
}

class Gr4j {
 public:
  explicit Gr4j(const Parameters& parameters)
      : p_(parameters),
        production_(0.3 * parameters.x1),
        routing_(0.5 * parameters.x3),
        hydrograph1_(sCurve1, parameters.x4, parameters.x4),
        hydrograph2_(sCurve2, parameters.x4, 2.0 * parameters.x4) {}

  /// One day with `precipitation` (rain and melt) and `pet`, both mm.
  Fluxes advance(double precipitation, double pet) {
    Fluxes today;
    const double routed = fillProductionStore(precipitation, pet, today);
    const double q9 = hydrograph1_.advance(0.9 * routed);
    const double q1 = hydrograph2_.advance(0.1 * routed);
    // Exchange with the groundwater, the same potential amount for both branches (eq. 18): F = X2 (R/X3)^(7/2).
    const double ratio = routing_ / p_.x3;
    const double exchange = p_.x2 * ratio * ratio * ratio * std::sqrt(ratio);
    // Routing store: R = max(0, R + Q9 + F) (eq. 19), its outflow Qr (eqs. 20, 21).
    const double filled = std::max(0.0, routing_ + q9 + exchange);
    const double exchangeRouting = filled - (routing_ + q9);
    const double qr = storeOutflow(filled, filled / p_.x3);
    routing_ = filled - qr;
    // Direct branch: Qd = max(0, Q1 + F) (eq. 22); total (eq. 23).
    const double qd = std::max(0.0, q1 + exchange);
    today.runoff = qr + qd;
    today.exchange = exchangeRouting + (qd - q1);
    return today;
  }

  double production() const { return production_; }  ///< S, mm
  double routing() const { return routing_; }        ///< R, mm
  double stored() const { return production_ + routing_ + hydrograph1_.stored() + hydrograph2_.stored(); }
  const UnitHydrograph& hydrograph1() const { return hydrograph1_; }
  const UnitHydrograph& hydrograph2() const { return hydrograph2_; }

 private:
  /// Interception, production store and percolation (eqs. 1-8); gives the water Pr that goes to the routing, mm.
  double fillProductionStore(double precipitation, double pet, Fluxes& today) {
    const double fill = production_ / p_.x1;
    double netRain = 0.0;
    double intoStore = 0.0;
    if (precipitation >= pet) {
      // Pn = P - E (eq. 1); Ps = X1 (1 - (S/X1)^2) tanh(Pn/X1) / (1 + S/X1 tanh(Pn/X1)) (eq. 3).
      netRain = precipitation - pet;
      const double wetting = std::tanh(netRain / p_.x1);
      intoStore = p_.x1 * (1.0 - fill * fill) * wetting / (1.0 + fill * wetting);
      today.evapotranspiration = pet;
      production_ += intoStore;
    } else {
      // En = E - P (eq. 2); Es = S (2 - S/X1) tanh(En/X1) / (1 + (1 - S/X1) tanh(En/X1)) (eq. 4).
      const double drying = std::tanh((pet - precipitation) / p_.x1);
      const double fromStore = production_ * (2.0 - fill) * drying / (1.0 + (1.0 - fill) * drying);
      today.evapotranspiration = precipitation + fromStore;
      production_ -= fromStore;
    }
    // Perc = S (1 - (1 + (4/9 S/X1)^4)^(-1/4)) (eqs. 6, 7); Pr = Perc + (Pn - Ps) (eq. 8).
    const double percolation = storeOutflow(production_, 4.0 / 9.0 * production_ / p_.x1);
    production_ -= percolation;
    return percolation + (netRain - intoStore);
  }

  Parameters p_;
  double production_;           ///< S, starts at 30 % of its capacity; a year of warm-up makes that forgotten
  double routing_;              ///< R, starts at 50 %
  UnitHydrograph hydrograph1_;  ///< of the 90 % through the routing store
  UnitHydrograph hydrograph2_;  ///< of the 10 % that bypass it
};

/// Mean snowfall of a year of 365.25 days, mm.
inline double meanAnnualSolidPrecipitation(std::span<const Forcing> days) {
  double sum = 0.0;
  for (const Forcing& day : days) sum += day.precipitation * solidFraction(day.tmin, day.tmax);
  return days.empty() ? 0.0 : sum / static_cast<double>(days.size()) * 365.25;
}

struct DailyResult {
  double runoff = 0.0;              ///< mm
  double snowWater = 0.0;           ///< mm, at the end of the day
  double productionStore = 0.0;     ///< mm, at the end of the day
  double evapotranspiration = 0.0;  ///< mm
};

inline std::vector<DailyResult> simulate(const Parameters& parameters, std::span<const Forcing> days) {
  SnowPack snow(parameters, meanAnnualSolidPrecipitation(days));
  Gr4j catchment(parameters);
  std::vector<DailyResult> results;
  results.reserve(days.size());
  for (const Forcing& day : days) {
    const double water = snow.advance(day);
    const Fluxes fluxes = catchment.advance(water, day.pet);
    results.push_back({fluxes.runoff, snow.water(), catchment.production(), fluxes.evapotranspiration});
  }
  return results;
}

// ---- files

constexpr std::string_view kOutputHeader =
    "time,discharge_m3s,snow_water_equivalent_mm,production_store_mm,evapotranspiration_mm\n";

[[noreturn]] inline void fail(const std::string& message) {
  throw std::runtime_error(message);
}

inline std::string_view trimmed(std::string_view text) {
  constexpr std::string_view kBlanks = " \t\r";
  const auto first = text.find_first_not_of(kBlanks);
  return first == std::string_view::npos ? "" : text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

inline std::string readFile(const std::string& name) {
  std::ifstream file(name, std::ios::binary);
  std::string content{std::istreambuf_iterator<char>(file), {}};
  if (!file || content.empty()) fail(name + ": cannot be read, or is empty");
  return content;
}

/// Cuts the first line, without its line end, off `rest`.
inline std::string_view takeLine(std::string_view& rest) {
  const auto end = std::min(rest.find('\n'), rest.size());
  const std::string_view line = rest.substr(0, end);
  rest.remove_prefix(std::min(end + 1, rest.size()));
  return line;
}

inline double toNumber(std::string_view text, const std::string& place) {
  text = trimmed(text);
  double value = 0.0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size() || !std::isfinite(value)) {
    fail(place + ": expected a number, found '" + std::string(text) + "'");
  }
  return value;
}

/// The lines `name = value` of a parameter file.
class ParameterFile {
 public:
  explicit ParameterFile(const std::string& name) : name_(name) {
    const std::string content = readFile(name);
    std::string_view rest = content;
    for (int line = 1; !rest.empty(); ++line) {
      std::string_view text = takeLine(rest);
      text = trimmed(text.substr(0, text.find('#')));
      if (text.empty()) continue;
      const auto equals = text.find('=');
      const std::string place = name + ":" + std::to_string(line);
      if (equals == std::string_view::npos) fail(place + ": expected 'name = value'");
      const std::string key(trimmed(text.substr(0, equals)));
      if (!values_.emplace(key, Value{std::string(trimmed(text.substr(equals + 1))), place}).second) {
        fail(place + ": '" + key + "' is given a second time");
      }
    }
  }

  /// Takes a number out; it must lie in lowest..highest.
  double number(const std::string& key, double lowest, double highest) {
    const auto found = values_.find(key);
    if (found == values_.end()) fail(name_ + ": '" + key + "' is missing");
    const double value = toNumber(found->second.text, found->second.place);
    if (value < lowest || value > highest) fail(found->second.place + ": '" + key + "' is out of its range");
    values_.erase(found);
    return value;
  }

  /// Takes a date out, as text; `otherwise` when there is none.
  std::string date(const std::string& key, const std::string& otherwise) {
    const auto found = values_.find(key);
    if (found == values_.end()) return otherwise;
    if (found->second.text.size() != 10) fail(found->second.place + ": expected a date such as 2001-01-31");
    std::string text = found->second.text;
    values_.erase(found);
    return text;
  }

  void checkAllTaken() const {
    if (!values_.empty()) fail(values_.begin()->second.place + ": unknown name '" + values_.begin()->first + "'");
  }

 private:
  struct Value {
    std::string text;
    std::string place;
  };
  std::string name_;
  std::map<std::string, Value> values_;
};

struct Series {
  std::vector<std::string> times;
  std::vector<Forcing> days;
};

/// Indices of the five wanted columns in a header row, in the order time, precipitation, PET, tmin, tmax.
inline std::array<std::size_t, 5> findColumns(std::string_view header, const std::string& place) {
  constexpr std::array<std::string_view, 5> kNames{"time", "precipitation_mm", "pet_mm", "tmin_degC", "tmax_degC"};
  std::array<std::size_t, 5> columns{};
  for (std::size_t wanted = 0; wanted < kNames.size(); ++wanted) {
    std::string_view rest = header;
    for (std::size_t column = 0;; ++column) {
      const auto comma = rest.find(',');
      if (trimmed(rest.substr(0, comma)) == kNames[wanted]) {
        columns[wanted] = column;
        break;
      }
      if (comma == std::string_view::npos) fail(place + ": no column '" + std::string(kNames[wanted]) + "'");
      rest.remove_prefix(comma + 1);
    }
  }
  return columns;
}

/// Reads the days from `start` to `end`, both included.
inline Series readForcing(const std::string& name, const std::string& start, const std::string& end) {
  const std::string content = readFile(name);
  std::string_view rest = content;
  int lineNumber = 0;
  std::string_view header;
  do {
    header = takeLine(rest);
    ++lineNumber;
  } while (!rest.empty() && header.starts_with('#'));
  const auto columns = findColumns(header, name + ":" + std::to_string(lineNumber));

  Series series;
  std::vector<std::string_view> cells;
  while (!rest.empty()) {
    std::string_view line = trimmed(takeLine(rest));
    ++lineNumber;
    if (line.empty()) continue;
    cells.clear();
    for (std::size_t comma = 0; comma != std::string_view::npos; line.remove_prefix(comma + 1)) {
      comma = line.find(',');
      cells.push_back(line.substr(0, comma));
      if (comma == std::string_view::npos) break;
    }
    const std::string place = name + ":" + std::to_string(lineNumber);
    if (cells.size() <= *std::max_element(columns.begin(), columns.end())) fail(place + ": the row is cut short");
    const std::string_view time = trimmed(cells[columns[0]]);
    if (time.substr(0, 10) < start || time.substr(0, 10) > end) continue;
    const Forcing day{toNumber(cells[columns[1]], place), toNumber(cells[columns[2]], place),
                      toNumber(cells[columns[3]], place), toNumber(cells[columns[4]], place)};
    if (day.precipitation < 0.0 || day.pet < 0.0) fail(place + ": precipitation and pet cannot be negative");
    if (day.tmin > day.tmax) fail(place + ": tmin is above tmax");
    series.times.emplace_back(time);
    series.days.push_back(day);
  }
  if (series.days.empty()) fail(name + ": no day from " + start + " to " + end);
  return series;
}

/// Writes beside `name` and renames, so that whoever reads `name` never sees half of it.
inline void writeFile(const std::string& name, const std::string& content) {
  const std::string temporary = name + ".part";
  std::ofstream file(temporary, std::ios::binary | std::ios::trunc);
  file.write(content.data(), static_cast<std::streamsize>(content.size()));
  file.close();
  if (!file || std::rename(temporary.c_str(), name.c_str()) != 0) {
    std::remove(temporary.c_str());
    fail(name + ": cannot be written");
  }
}

inline void appendNumber(std::string& text, double value) {
  std::array<char, 32> buffer{};
  // Seven digits: as many as a reader that works in single precision can tell apart.
  const auto end = std::to_chars(buffer.data(), buffer.data() + buffer.size(), value, std::chars_format::general, 7);
  text += ',';
  text.append(buffer.data(), end.ptr);
}

inline void run(const std::string& parameterName, const std::string& forcingName, const std::string& simulatedName) {
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
  std::string text(kOutputHeader);
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

}  // namespace gr4j

#ifndef GR4J_WITHOUT_MAIN  // the test includes this file
int main(int argc, char** argv) {
  if (argc != 4) {
    std::fputs("Usage: gr4j_cemaneige PARAMETER_FILE FORCING_CSV SIMULATED_CSV\n", stderr);
    return 1;
  }
  try {
    gr4j::run(argv[1], argv[2], argv[3]);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "gr4j_cemaneige: %s\n", error.what());
    return 1;
  }
  return 0;
}
#endif

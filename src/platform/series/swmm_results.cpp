#include "platform/series/swmm_results.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::int32_t kMagic = 516114522;
constexpr std::int32_t kOldest = 51000;    ///< earlier versions number their variables in another way
constexpr std::uint64_t kHeadNumbers = 7;  ///< magic, version, flow units, and the counts of four kinds
constexpr std::uint64_t kEndBytes = 24;    ///< three places, number of records, error code, magic
constexpr std::size_t kMostObjects = 10'000'000;
constexpr std::uint64_t kLeastName = 4;  ///< bytes of a name: its length comes first
constexpr std::int64_t kDayZero = dayNumber(1899, 12, 30);

constexpr std::array<std::string_view, 4> kKindNames = {"subcatchment", "node", "link", "system"};
constexpr std::array<std::string_view, 8> kSubcatchmentVariables = {
    "rainfall", "snow depth",       "evaporation",           "infiltration",
    "runoff",   "groundwater flow", "groundwater elevation", "soil moisture"};
constexpr std::array<std::string_view, 6> kNodeVariables = {"depth",          "head",         "volume",
                                                            "lateral inflow", "total inflow", "flooding"};
constexpr std::array<std::string_view, 5> kLinkVariables = {"flow", "depth", "velocity", "volume", "capacity"};
constexpr std::array<std::string_view, 15> kSystemVariables = {"air temperature",
                                                               "rainfall",
                                                               "snow depth",
                                                               "losses",
                                                               "runoff",
                                                               "dry weather inflow",
                                                               "groundwater inflow",
                                                               "RDII inflow",
                                                               "direct inflow",
                                                               "total lateral inflow",
                                                               "flooding",
                                                               "outflow",
                                                               "storage volume",
                                                               "evaporation",
                                                               "potential evapotranspiration"};

enum class Unit { rain, depth, length, loss, flow, volume, velocity, none, temperature };
constexpr std::array<Unit, 8> kSubcatchmentUnits = {Unit::rain, Unit::depth, Unit::loss,   Unit::rain,
                                                    Unit::flow, Unit::flow,  Unit::length, Unit::none};
constexpr std::array<Unit, 6> kNodeUnits = {Unit::length, Unit::length, Unit::volume,
                                            Unit::flow,   Unit::flow,   Unit::flow};
constexpr std::array<Unit, 5> kLinkUnits = {Unit::flow, Unit::length, Unit::velocity, Unit::volume, Unit::none};
constexpr std::array<Unit, 15> kSystemUnits = {Unit::temperature, Unit::rain, Unit::depth,  Unit::rain, Unit::flow,
                                               Unit::flow,        Unit::flow, Unit::flow,   Unit::flow, Unit::flow,
                                               Unit::flow,        Unit::flow, Unit::volume, Unit::loss, Unit::loss};

std::span<const std::string_view> variablesOf(std::size_t kind) {
  constexpr std::array<std::span<const std::string_view>, 4> kVariables = {kSubcatchmentVariables, kNodeVariables,
                                                                           kLinkVariables, kSystemVariables};
  return kVariables.at(kind);
}

std::string_view textOf(Unit unit, int flowUnits) {
  constexpr std::array<std::string_view, 6> kFlows = {"ft3/s", "gal/min", "Mgal/d", "m3/s", "L/s", "ML/d"};
  const bool isMetric = flowUnits >= 3;
  switch (unit) {
    case Unit::rain:
      return isMetric ? "mm/h" : "in/h";
    case Unit::depth:
      return isMetric ? "mm" : "in";
    case Unit::loss:
      return isMetric ? "mm/d" : "in/d";
    case Unit::length:
      return isMetric ? "m" : "ft";
    case Unit::flow:
      return kFlows.at(static_cast<std::size_t>(flowUnits));
    case Unit::volume:
      return isMetric ? "m3" : "ft3";
    case Unit::velocity:
      return isMetric ? "m/s" : "ft/s";
    case Unit::temperature:
      return isMetric ? "deg C" : "deg F";
    case Unit::none:
      break;
  }
  return {};
}

}  // namespace

bool SwmmResults::fits(std::string_view head) {
  return beginsWith(head, kMagic);
}

bool SwmmResults::readHeader() {
  groups_ = {};
  pollutants_.clear();
  pollutantUnits_.clear();
  const auto magic = file_.number<std::int32_t>(0);
  if (!magic || *magic != kMagic) {
    return fail("expected results of SWMM 5 or EPANET 2, found a file that begins with the mark of neither");
  }
  if (!readEnd()) return false;
  const auto head = file_.numbers<std::int32_t>(0, kHeadNumbers);
  if (!head) return false;
  if ((*head)[1] < kOldest) {
    return fail(fmt::format("expected results of SWMM 5.1 or later, found those of version {}", (*head)[1]));
  }
  flowUnits_ = (*head)[2];
  if (flowUnits_ < 0 || flowUnits_ > 5) {
    return fail(fmt::format("expected a code of flow units from 0 to 5 at byte 8, found {}", flowUnits_));
  }
  std::uint64_t total = 0;
  for (std::size_t i = 0; i < kKinds; ++i) {
    const std::int32_t count = (*head)[3 + i];
    if (count < 0 || static_cast<std::size_t>(count) > kMostObjects ||
        (total += static_cast<std::uint64_t>(count)) > file_.size() / kLeastName) {
      return fail(fmt::format("expected a number of objects at byte {}, found {}", 12 + 4 * i, count));
    }
    if (i < kSystem)
      groups_[i].objects.resize(static_cast<std::size_t>(count));
    else
      pollutants_.resize(static_cast<std::size_t>(count));
  }
  groups_[kSystem].objects.emplace_back();
  std::uint64_t place = kHeadNumbers * 4;
  return readNames(place) && readVariables(place) && readSteps();
}

/// The closing record, which is written when a run ends.
bool SwmmResults::readEnd() {
  const auto end = file_.size() < kEndBytes ? std::nullopt : file_.numbers<std::int32_t>(file_.size() - kEndBytes, 6);
  if (!end || (*end)[5] != kMagic) {
    return fail(
        fmt::format("expected the closing record of SWMM 5 at its end, byte {}, found none: the file is cut off, "
                    "or the model has not ended its run",
                    file_.size() < kEndBytes ? 0 : file_.size() - kEndBytes));
  }
  if ((*end)[4] != 0) {
    return fail(fmt::format("the model ended with the error code {}, which its report explains", (*end)[4]));
  }
  if ((*end)[2] < 0 || (*end)[3] < 0) {
    return fail(fmt::format("expected the place and the number of its records at byte {}, found {} and {}",
                            file_.size() - kEndBytes + 8, (*end)[2], (*end)[3]));
  }
  results_ = static_cast<std::uint64_t>((*end)[2]);
  steps_ = static_cast<std::size_t>((*end)[3]);
  return true;
}

bool SwmmResults::readNames(std::uint64_t& place) {
  constexpr std::int32_t kLongestName = 4096;
  const auto readList = [&](std::vector<std::string>& names) {
    for (std::string& name : names) {
      const auto length = file_.number<std::int32_t>(place);
      if (!length) return false;
      if (*length < 0 || *length > kLongestName) {
        return fail(fmt::format("expected the length of a name at byte {}, found {}", place, *length));
      }
      auto text = file_.text(place + 4, static_cast<std::size_t>(*length));
      if (!text) return false;
      name = onOneLine(*text);
      place += 4 + static_cast<std::uint64_t>(*length);
    }
    return true;
  };
  for (std::size_t kind = kSubcatchment; kind < kSystem; ++kind) {
    if (!readList(groups_[kind].objects)) return false;
  }
  if (!readList(pollutants_)) return false;
  auto units = file_.numbers<std::int32_t>(place, pollutants_.size());
  if (!units) return false;
  pollutantUnits_.assign(units->begin(), units->end());
  place += 4 * pollutants_.size();
  return true;
}

/// Passes over the properties of the objects and reads which variables there are of each kind.
bool SwmmResults::readVariables(std::uint64_t& place) {
  constexpr std::int32_t kMostCodes = 1'000'000;
  const auto countAt = [&](const char* what) -> std::optional<std::uint64_t> {
    const auto count = file_.number<std::int32_t>(place);
    if (count && (*count < 0 || *count > kMostCodes)) {
      fail(fmt::format("expected the number of {} at byte {}, found {}", what, place, *count));
      return std::nullopt;
    }
    place += 4;
    return count ? std::optional(static_cast<std::uint64_t>(*count)) : std::nullopt;
  };
  for (std::size_t kind = kSubcatchment; kind < kSystem; ++kind) {
    const auto count = countAt("properties");
    if (!count) return false;
    place += 4 * *count * (1 + groups_[kind].objects.size());
  }
  std::uint64_t begin = 0;
  for (std::size_t kind = kSubcatchment; kind < kKinds; ++kind) {
    const auto count = countAt("variables");
    if (!count) return false;
    const auto codes = file_.numbers<std::int32_t>(place, static_cast<std::size_t>(*count));
    if (!codes) return false;
    groups_[kind].variables.assign(codes->begin(), codes->end());
    groups_[kind].begin = begin;
    begin += 4 * *count * groups_[kind].objects.size();
    place += 4 * *count;
  }
  record_ = 8 + begin;
  std::uint64_t items = 0;
  for (const Group& group : groups_) items += group.objects.size() * group.variables.size();
  return items <= kMostObjects || fail(fmt::format("it has {} items, more than {}", items, kMostObjects));
}

bool SwmmResults::readSteps() {
  const std::uint64_t expected = results_ + steps_ * record_ + kEndBytes;
  if (expected != file_.size()) {
    return fail(fmt::format("expected {} bytes for {} of {} bytes each, found {}", expected,
                            countText(steps_, "record"), record_, file_.size()));
  }
  const auto dates = file_.column<double>(results_, record_, steps_);
  if (!dates) return false;
  std::vector<std::int64_t> seconds;
  seconds.reserve(dates->size());
  for (const double date : *dates) {
    if (!(std::abs(date) < 1e6)) {
      return fail(fmt::format("expected a date in record {}, found {}", seconds.size() + 1, date));
    }
    seconds.push_back(kDayZero * kSecondsOfDay + std::llround(date * static_cast<double>(kSecondsOfDay)));
  }
  return setTimes(seconds);
}

int SwmmResults::itemCount() const {
  int count = 0;
  for (const Group& group : groups_) count += group.itemCount();
  return count;
}

SwmmResults::Place SwmmResults::placeOf(int item) const {
  int rest = item - 1;
  std::size_t kind = kSubcatchment;
  while (rest >= groups_[kind].itemCount()) rest -= groups_[kind++].itemCount();
  const auto variables = static_cast<int>(groups_[kind].variables.size());
  return {static_cast<Kind>(kind), static_cast<std::size_t>(rest / variables),
          static_cast<std::size_t>(rest % variables)};
}

std::string SwmmResults::itemName(int item) const {
  if (!hasItem(item)) return {};
  const Place place = placeOf(item);
  const Group& group = groups_[place.kind];
  const auto names = variablesOf(place.kind);
  const auto code = static_cast<std::size_t>(group.variables[place.variable]);
  std::string variable = code < names.size()                        ? std::string(names[code])
                         : code - names.size() < pollutants_.size() ? pollutants_[code - names.size()]
                                                                    : fmt::format("variable {}", code);
  if (place.kind == kSystem) return fmt::format("system: {}", variable);
  return fmt::format("{} {}: {}", kKindNames.at(place.kind), group.objects[place.object], variable);
}

std::string SwmmResults::itemUnit(int item) const {
  if (!hasItem(item)) return {};
  const Place place = placeOf(item);
  const auto code = static_cast<std::size_t>(groups_[place.kind].variables[place.variable]);
  constexpr std::array<std::span<const Unit>, 4> kUnits = {kSubcatchmentUnits, kNodeUnits, kLinkUnits, kSystemUnits};
  const std::span<const Unit> units = kUnits.at(place.kind);
  if (code < units.size()) return std::string(textOf(units[code], flowUnits_));
  constexpr std::array<std::string_view, 3> kConcentrations = {"mg/L", "ug/L", "1/L"};
  const std::size_t pollutant = code - units.size();
  if (pollutant >= pollutantUnits_.size()) return {};
  const auto unit = static_cast<std::size_t>(pollutantUnits_[pollutant]);
  return unit < kConcentrations.size() ? std::string(kConcentrations.at(unit)) : std::string();
}

std::optional<std::vector<double>> SwmmResults::readValues(int item) {
  const Place place = placeOf(item);
  const Group& group = groups_[place.kind];
  const std::uint64_t inRecord = 8 + group.begin + 4 * (place.object * group.variables.size() + place.variable);
  const auto read = file_.column<float>(results_ + inRecord, record_, steps_);
  if (!read) return std::nullopt;
  return std::vector<double>(read->begin(), read->end());
}

}  // namespace mirevo

#include "platform/series/netcdf_time_series.h"

#include <cmath>
#include <limits>
#include <optional>

#include <fmt/core.h>
#include <netcdf.h>

#include "common/calendar.h"
#include "common/files.h"
#include "common/text.h"
#include "platform/series/netcdf_classic.h"
#include "platform/series/netcdf_functions.h"
#include "platform/series/netcdf_units.h"
#include "platform/series/printed_units.h"

namespace mirevo {
namespace {

/// Set by the first file that is opened.
const NetcdfFunctions* library = nullptr;

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// A variable's name, type and dimensions, with their lengths.
struct Variable {
  std::string name;
  nc_type type = NC_NAT;
  std::vector<int> dimensions;
  std::vector<std::size_t> lengths;
};

std::optional<Variable> inquireVariable(int file, int variable) {
  char name[NC_MAX_NAME + 1] = {};
  int dimensionCount = 0;
  Variable result;
  if (library->inq_var(file, variable, name, &result.type, &dimensionCount, nullptr, nullptr) != NC_NOERR)
    return std::nullopt;
  result.name = name;
  result.dimensions.resize(static_cast<std::size_t>(dimensionCount));
  if (library->inq_vardimid(file, variable, result.dimensions.data()) != NC_NOERR) return std::nullopt;
  for (const int dimension : result.dimensions) {
    std::size_t length = 0;
    if (library->inq_dimlen(file, dimension, &length) != NC_NOERR) return std::nullopt;
    result.lengths.push_back(length);
  }
  return result;
}

bool isNumeric(nc_type type) {
  return type == NC_BYTE || type == NC_UBYTE || type == NC_SHORT || type == NC_USHORT || type == NC_INT ||
         type == NC_UINT || type == NC_INT64 || type == NC_UINT64 || type == NC_FLOAT || type == NC_DOUBLE;
}

/// A text attribute, of type char or string; empty when there is none.
std::string textAttribute(int file, int variable, const char* name) {
  nc_type type = NC_NAT;
  std::size_t length = 0;
  if (library->inq_att(file, variable, name, &type, &length) != NC_NOERR || length == 0) return {};
  if (type == NC_CHAR) {
    std::string text(length, '\0');
    if (library->get_att_text(file, variable, name, text.data()) != NC_NOERR) return {};
    return text.substr(0, text.find('\0'));
  }
  if (type != NC_STRING) return {};
  std::vector<char*> texts(length, nullptr);
  if (library->get_att_string(file, variable, name, texts.data()) != NC_NOERR) return {};
  std::string text = texts.front() != nullptr ? texts.front() : "";
  library->free_string(length, texts.data());
  return text;
}

/// A numeric attribute; its type is NC_NAT and it has no numbers where there is none.
struct Numbers {
  nc_type type = NC_NAT;
  std::vector<double> values;
};

Numbers numbersAttribute(int file, int variable, const char* name) {
  Numbers numbers;
  std::size_t length = 0;
  if (library->inq_att(file, variable, name, &numbers.type, &length) != NC_NOERR || !isNumeric(numbers.type)) return {};
  numbers.values.resize(length);
  if (library->get_att_double(file, variable, name, numbers.values.data()) != NC_NOERR) return {};
  return numbers;
}

/// The first number of a numeric attribute.
std::optional<double> numberAttribute(int file, int variable, const char* name) {
  const Numbers numbers = numbersAttribute(file, variable, name);
  return numbers.values.empty() ? std::nullopt : std::optional(numbers.values.front());
}

/// The library's fill value for values that were not written, as by a model that stopped half-way. Bytes have none.
std::optional<double> defaultFill(nc_type type) {
  switch (type) {
    case NC_SHORT:
      return NC_FILL_SHORT;
    case NC_USHORT:
      return NC_FILL_USHORT;
    case NC_INT:
      return NC_FILL_INT;
    case NC_UINT:
      return NC_FILL_UINT;
    case NC_INT64:
      return static_cast<double>(NC_FILL_INT64);
    case NC_UINT64:
      return static_cast<double>(NC_FILL_UINT64);
    case NC_FLOAT:
      return static_cast<double>(NC_FILL_FLOAT);
    case NC_DOUBLE:
      return NC_FILL_DOUBLE;
    default:
      return std::nullopt;
  }
}

bool isFloating(nc_type type) {
  return type == NC_FLOAT || type == NC_DOUBLE;
}

/// Converts the stored numbers of a variable to values.
class Unpacking final {
 public:
  Unpacking(int file, int variable, nc_type type)
      : type_(type),
        scale_(numberAttribute(file, variable, "scale_factor")),
        offset_(numberAttribute(file, variable, "add_offset")) {
    Numbers fill = numbersAttribute(file, variable, "_FillValue");
    if (fill.values.empty()) {
      if (const auto byDefault = defaultFill(type)) fill = {type, {*byDefault}};
    }
    addMarkers(fill);
    addMarkers(numbersAttribute(file, variable, "missing_value"));
  }

  /// Takes numbers outside `valid_min`, `valid_max` and `valid_range` as missing, too.
  void applyValidRange(int file, int variable) {
    // Its numbers, limits among them, are meant without a sign, which the file's type does not say.
    if (equalIgnoringCase(textAttribute(file, variable, "_Unsigned"), "true")) return;
    const Numbers range = numbersAttribute(file, variable, "valid_range");
    if (range.values.size() == 2) {
      addLimit(range.type, range.values[0], true);
      addLimit(range.type, range.values[1], false);
    }
    for (const bool isLower : {true, false}) {
      const Numbers limit = numbersAttribute(file, variable, isLower ? "valid_min" : "valid_max");
      if (limit.values.size() == 1) addLimit(limit.type, limit.values[0], isLower);
    }
  }

  /// NaN for a stored number that marks a gap.
  double operator()(double stored) const {
    const double value = stored * scale_.value_or(1.0) + offset_.value_or(0.0);
    for (const Marker& marker : markers_) {
      const double number = marker.isOfUnpacked ? value : stored;
      if (marker.isSingle ? static_cast<float>(number) == static_cast<float>(marker.value) : number == marker.value) {
        return kNaN;
      }
    }
    for (const Limit& limit : limits_) {
      const Marker& bound = limit.bound;
      const double number = bound.isOfUnpacked ? value : stored;
      const double least = limit.isLower ? bound.value : number;
      const double most = limit.isLower ? number : bound.value;
      if (bound.isSingle ? static_cast<float>(most) < static_cast<float>(least) : most < least) return kNaN;
    }
    return value;
  }

 private:
  /// A number that an attribute gives. It is compared in single precision where one of the two numbers has no more:
  /// 1e20 in 64 bits is the marker of a variable of 32 bits that holds 1e20.
  struct Marker {
    double value = 0.0;
    bool isSingle = false;
    bool isOfUnpacked = false;  ///< compared with the unpacked value, not with the stored number
  };
  struct Limit {
    Marker bound;
    bool isLower = false;
  };

  bool isPacked() const { return scale_.has_value() || offset_.has_value(); }
  bool isSingle(nc_type type) const { return type == NC_FLOAT || type_ == NC_FLOAT; }

  /// Markers are meant for the stored numbers; some files give one of another type for the unpacked values.
  void addMarkers(const Numbers& numbers) {
    for (const double value : numbers.values) {
      markers_.push_back({value, isSingle(numbers.type), false});
      if (isPacked() && numbers.type != type_) markers_.push_back({value, true, true});
    }
  }
  /// By the NetCDF conventions a limit is one of the unpacked values if it has their type and not that of the variable.
  void addLimit(nc_type type, double value, bool isLower) {
    const bool isOfUnpacked = isPacked() && type != type_ && isFloating(type);
    limits_.push_back({{value, isOfUnpacked || isSingle(type), isOfUnpacked}, isLower});
  }

  nc_type type_;
  std::optional<double> scale_;
  std::optional<double> offset_;
  std::vector<Marker> markers_;
  std::vector<Limit> limits_;
};

}  // namespace

NetcdfTimeSeries::~NetcdfTimeSeries() {
  close();
}

void NetcdfTimeSeries::close() {
  if (file_ >= 0) library->close(file_);
  file_ = -1;
  timeDimension_ = -1;
  times_.clear();
  items_.clear();
  places_.clear();
}

bool NetcdfTimeSeries::fail(const std::string& what) {
  lastError_ = fileName_ + ": " + what;
  return false;
}

bool NetcdfTimeSeries::succeeded(int status, const std::string& what) {
  return status == NC_NOERR || fail(what + ": " + library->strerror(status));
}

bool NetcdfTimeSeries::open(const std::string& fileName) {
  close();
  lastError_.clear();
  fileName_ = fileName;
  if (const std::string fault = faultOfFile(fileName); !fault.empty()) return fail("opening: " + fault);
  if (const auto cutOff = findCutOff(fileName)) return fail(*cutOff);
  std::string reason;
  library = netcdfFunctions(reason);
  if (library == nullptr) return fail("NetCDF files cannot be read: " + reason);
  int timeVariable = -1;
  if (succeeded(library->open(fileName.c_str(), NC_NOWRITE, &file_), "opening") && findTimeVariable(timeVariable) &&
      readTimes(timeVariable) && findItems(timeVariable)) {
    return true;
  }
  close();
  return false;
}

bool NetcdfTimeSeries::findTimeVariable(int& timeVariable) {
  int variableCount = 0;
  if (!succeeded(library->inq_nvars(file_, &variableCount), "reading the variables")) return false;
  timeVariable = -1;
  for (int id = 0; id < variableCount; ++id) {
    const std::optional<Variable> variable = inquireVariable(file_, id);
    if (!variable || variable->dimensions.size() != 1 || !isNumeric(variable->type)) continue;
    if (toLowerAscii(textAttribute(file_, id, "units")).find(" since ") == std::string::npos) continue;
    char dimensionName[NC_MAX_NAME + 1] = {};
    if (!succeeded(library->inq_dimname(file_, variable->dimensions[0], dimensionName), "reading a dimension"))
      return false;
    const bool isCoordinate = variable->name == dimensionName;
    if (timeVariable >= 0 && !isCoordinate) continue;
    timeVariable = id;
    timeDimension_ = variable->dimensions[0];
    if (isCoordinate) break;
  }
  if (timeVariable >= 0) return true;
  return fail("expected a time variable over one dimension with units like \"hours since 1990-01-01\", found none");
}

bool NetcdfTimeSeries::readTimes(int timeVariable) {
  const std::optional<Variable> variable = inquireVariable(file_, timeVariable);
  if (!variable) return fail("the time variable cannot be read");
  const std::string where = "variable \"" + variable->name + "\"";
  const std::size_t count = variable->lengths[0];
  if (count > kMostNetcdfSteps) {
    return fail(fmt::format("{}: expected at most {} steps, found {}", where, kMostNetcdfSteps, count));
  }
  std::string reason;
  const std::optional<TimeUnits> units = parseTimeUnits(textAttribute(file_, timeVariable, "units"),
                                                        textAttribute(file_, timeVariable, "calendar"), reason);
  if (!units) return fail(where + ": " + reason);
  std::vector<double> stored(count);
  if (!succeeded(library->get_var_double(file_, timeVariable, stored.data()), "reading " + where)) return false;
  const Unpacking unpack(file_, timeVariable, variable->type);
  const auto earliest = static_cast<double>(secondNumber({0, 1, 1}));
  const auto latest = static_cast<double>(secondNumber({9999, 12, 31}));
  double first = 0.0;
  times_.reserve(count);
  double firstFraction = 0.0;  // fraction of a second after startSecond_
  for (std::size_t step = 0; step < count; ++step) {
    const double seconds = unpack(stored[step]) * units->secondsPerUnit;
    const double absolute = static_cast<double>(units->originSecond) + seconds;
    if (!(absolute >= earliest && absolute <= latest)) {
      return fail(fmt::format("{}, step {}: expected a time, found {}", where, step + 1, formatReal(stored[step])));
    }
    if (step == 0) {
      first = seconds;
      // Rounded to the millisecond: a time in days is not always a whole second in 64 bits.
      const double milliseconds = std::round(seconds * 1000.0);
      startSecond_ = units->originSecond + static_cast<std::int64_t>(std::floor(milliseconds / 1000.0));
      firstFraction = (milliseconds - std::floor(milliseconds / 1000.0) * 1000.0) / 1000.0;
    }
    const double days = (seconds - first + firstFraction) / 86400.0;
    if (step > 0 && !(days > times_.back())) {
      return fail(fmt::format("{}, step {}: expected a time later than {}, found {}", where, step + 1,
                              formatReal(stored[step - 1]), formatReal(stored[step])));
    }
    times_.push_back(days);
  }
  return true;
}

bool NetcdfTimeSeries::findItems(int timeVariable) {
  int variableCount = 0;
  if (!succeeded(library->inq_nvars(file_, &variableCount), "reading the variables")) return false;
  const std::string bounds = textAttribute(file_, timeVariable, "bounds");
  for (int id = 0; id < variableCount; ++id) {
    const std::optional<Variable> variable = inquireVariable(file_, id);
    if (id == timeVariable || !variable || !isNumeric(variable->type) || variable->name == bounds) continue;
    Place place;
    place.variable = id;
    place.dimensionCount = static_cast<int>(variable->dimensions.size());
    place.timePosition = -1;
    int longDimensions = 0;
    std::size_t stations = 1;
    for (int position = 0; position < place.dimensionCount; ++position) {
      const auto p = static_cast<std::size_t>(position);
      if (place.timePosition < 0 && variable->dimensions[p] == timeDimension_) {
        place.timePosition = position;
      } else if (variable->lengths[p] != 1) {
        ++longDimensions;
        place.stationPosition = position;
        stations = variable->lengths[p];
      }
    }
    // A grid over time is not a table of stations: it has no items.
    if (place.timePosition < 0 || longDimensions > 1) continue;
    if (items_.size() + stations > kMostNetcdfItems) {
      return fail(
          fmt::format("expected at most {} items, found more at variable \"{}\"", kMostNetcdfItems, variable->name));
    }
    const std::string unit = textAttribute(file_, id, "units");
    for (place.station = 0; place.station < stations; ++place.station) {
      places_.push_back(place);
      items_.push_back({variable->name});
      items_.back().unit = unit;
      if (place.stationPosition >= 0) items_.back().name += fmt::format("[{}]", place.station + 1);
    }
  }
  return true;
}

std::optional<float> NetcdfTimeSeries::deleteValue() const {
  return std::numeric_limits<float>::quiet_NaN();
}

std::optional<std::vector<double>> NetcdfTimeSeries::readValues(std::size_t place) {
  const Place& at = places_[place];
  const std::string where = "variable \"" + items_[place].name + "\"";
  nc_type type = NC_NAT;
  if (!succeeded(library->inq_vartype(file_, at.variable, &type), "reading " + where)) return std::nullopt;
  std::vector<std::size_t> start(static_cast<std::size_t>(at.dimensionCount), 0);
  std::vector<std::size_t> count(start.size(), 1);
  count[static_cast<std::size_t>(at.timePosition)] = times_.size();
  if (at.stationPosition >= 0) start[static_cast<std::size_t>(at.stationPosition)] = at.station;
  std::vector<double> values(times_.size());
  if (!succeeded(library->get_vara_double(file_, at.variable, start.data(), count.data(), values.data()),
                 "reading " + where)) {
    return std::nullopt;
  }
  Unpacking unpack(file_, at.variable, type);
  unpack.applyValidRange(file_, at.variable);
  for (std::size_t step = 0; step < values.size(); ++step) {
    values[step] = unpack(values[step]);
    if (std::isinf(static_cast<float>(values[step]))) {
      fail(fmt::format("{}, step {}: expected a number of at most 3.4028235e38 in size, found {}", where, step + 1,
                       formatReal(values[step])));
      return std::nullopt;
    }
  }
  return values;
}

bool NetcdfTimeSeries::readItem(std::size_t place) {
  const std::optional<std::vector<double>> values = readValues(place);
  if (!values) return false;
  items_[place].values.reserve(values->size());
  for (const double value : *values) items_[place].values.push_back(static_cast<float>(value));
  return true;
}

std::vector<double> NetcdfTimeSeries::readExactItem(std::size_t place) {
  return readValues(place).value_or(std::vector<double>(times_.size(), kNaN));
}

NetcdfUnit NetcdfTimeSeries::unitOf(std::size_t place) const {
  const int variable = places_[place].variable;
  nc_type type = NC_NAT;
  if (library->inq_vartype(file_, variable, &type) != NC_NOERR || type == NC_DOUBLE) return {};
  if (type == NC_FLOAT) return {NetcdfUnit::Kind::single};
  return {NetcdfUnit::Kind::scaled, std::abs(numberAttribute(file_, variable, "scale_factor").value_or(1.0))};
}

std::vector<double> NetcdfTimeSeries::storedUnits(std::size_t place, std::span<const double> values) {
  return unitOf(place).unitsOf(values);
}

std::vector<double> NetcdfUnit::unitsOf(std::span<const double> values) const {
  if (kind == Kind::printed) return {};
  return kind == Kind::single ? singleUnits(values) : std::vector<double>(values.size(), scale);
}

}  // namespace mirevo

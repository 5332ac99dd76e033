#include "platform/series/netcdf_time_series.h"

#include <csignal>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <numeric>
#include <tuple>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <netcdf.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/processes/helper_process.h"
#include "platform/series/guarded_netcdf.h"
#include "platform/series/netcdf_units.h"
#include "platform/series/shown_values.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

/// A file that a test writes by calls of the library; values go into it as it is closed.
class NetcdfFile final {
 public:
  explicit NetcdfFile(const std::string& name, int mode = NC_NETCDF4)
      : path_(std::string(::testing::TempDir()) + "/" + name) {
    check(nc_create(path_.c_str(), mode | NC_CLOBBER, &id_));
  }
  ~NetcdfFile() { std::remove(path_.c_str()); }
  NetcdfFile(const NetcdfFile&) = delete;
  NetcdfFile& operator=(const NetcdfFile&) = delete;

  const std::string& path() const { return path_; }
  int dimension(const char* name, std::size_t length, bool isUnlimited = false) {
    int dimension = -1;
    check(nc_def_dim(id_, name, isUnlimited ? NC_UNLIMITED : length, &dimension));
    lengths_[dimension] = length;
    return dimension;
  }
  int variable(const char* name, nc_type type, std::vector<int> dimensions, std::vector<double> values = {}) {
    int variable = -1;
    check(nc_def_var(id_, name, type, static_cast<int>(dimensions.size()), dimensions.data(), &variable));
    std::vector<std::size_t> shape;
    for (const int dimension : dimensions) shape.push_back(lengths_.at(dimension));
    values_.emplace_back(variable, std::move(shape), std::move(values));
    return variable;
  }
  void text(int variable, const char* name, const std::string& value) const {
    check(nc_put_att_text(id_, variable, name, value.size(), value.c_str()));
  }
  void numbers(int variable, const char* name, nc_type type, const std::vector<double>& values) const {
    check(nc_put_att_double(id_, variable, name, type, values.size(), values.data()));
  }
  void number(int variable, const char* name, nc_type type, double value) const {
    numbers(variable, name, type, {value});
  }
  int time(int dimension, const std::string& units, std::vector<double> values) {
    const int variable = this->variable("time", NC_DOUBLE, {dimension}, std::move(values));
    text(variable, "units", units);
    return variable;
  }
  void close() const {
    nc_enddef(id_);  // an error where the format needs none
    for (const auto& [variable, shape, values] : values_) {
      const std::vector<std::size_t> start(shape.size(), 0);
      if (!values.empty()) check(nc_put_vara_double(id_, variable, start.data(), shape.data(), values.data()));
    }
    check(nc_close(id_));
  }
  /// Daily values of a variable "flow".
  int defineFlow(nc_type type, const std::vector<double>& flow) {
    const int days = dimension("time", flow.size());
    std::vector<double> numbers(flow.size());
    std::iota(numbers.begin(), numbers.end(), 0.0);
    time(days, "days since 1990-01-01", numbers);
    return variable("flow", type, {days}, flow);
  }
  void writeFlow(const std::vector<double>& flow) {
    defineFlow(NC_DOUBLE, flow);
    close();
  }

 private:
  static void check(int status) { ASSERT_EQ(status, NC_NOERR) << nc_strerror(status); }

  std::string path_;
  int id_ = -1;
  std::map<int, std::size_t> lengths_;                                                  ///< of the dimensions
  std::vector<std::tuple<int, std::vector<std::size_t>, std::vector<double>>> values_;  ///< variable, shape, values
};

/// That another process reads a file as this one does, bit for bit, and gives the same reason where it cannot.
void expectSameGuarded(const std::string& path) {
  NetcdfTimeSeries series;
  const auto reading = std::make_shared<SeriesReading>();
  for (const bool isAnnounced : {false, true}) {
    GuardedNetcdf guarded(reading);
    const std::vector<int> items = {5, 1, 99, 3};
    if (isAnnounced) guarded.willRead(items);
    ASSERT_EQ(guarded.open(path), series.open(path));
    EXPECT_EQ(guarded.lastError(), series.lastError());
    EXPECT_EQ(guarded.startTime(), series.startTime());
    EXPECT_EQ(timesOf(guarded), timesOf(series));
    ASSERT_EQ(guarded.itemCount(), series.itemCount());
    for (int item = 0; item <= series.itemCount() + 1; ++item) {
      EXPECT_EQ(guarded.itemName(item), series.itemName(item));
      EXPECT_EQ(guarded.itemUnit(item), series.itemUnit(item));
      EXPECT_EQ(guarded.getData(item), series.getData(item));
      EXPECT_EQ(guarded.lastError(), series.lastError());
      EXPECT_THAT(guarded.values(item), ::testing::Pointwise(NanSensitiveFloatEq(), series.values(item)));
      EXPECT_THAT(guarded.exactValues(item),
                  ::testing::Pointwise(::testing::NanSensitiveDoubleEq(), series.exactValues(item)));
      EXPECT_THAT(guarded.units(item), ::testing::Pointwise(::testing::NanSensitiveDoubleEq(), series.units(item)));
    }
  }
}

TEST(NetcdfTimeSeries, ReadsVariablesStationsAndPacking) {
  for (const int mode : {NC_CLASSIC_MODEL, NC_64BIT_OFFSET, NC_NETCDF4}) {
    NetcdfFile file("items.nc", mode);
    const int time = file.dimension("time", 3);
    const int station = file.dimension("station", 2);
    const int one = file.dimension("level", 1);
    const int two = file.dimension("nv", 2);
    file.text(file.time(time, "hours since 2001-01-01 00:00:00.0 UTC", {6, 12, 36}), "bounds", "time_bounds");
    file.variable("time_bounds", NC_DOUBLE, {time, two});
    file.variable("label", NC_CHAR, {time, two});
    file.variable("elevation", NC_FLOAT, {station});
    file.variable("grid", NC_FLOAT, {time, station, two});
    const int flow = file.variable("flow", NC_FLOAT, {time, station}, {1, 10, -1, 20, 3, 30});
    file.number(flow, "_FillValue", NC_FLOAT, -1.0);
    const int stage = file.variable("stage", NC_SHORT, {station, one, time}, {2, 4, 7, -32767, 7, 0});
    file.number(stage, "missing_value", NC_SHORT, 7);
    file.number(stage, "scale_factor", NC_DOUBLE, 0.5);
    file.number(stage, "add_offset", NC_DOUBLE, 100.0);
    file.text(file.variable("count", NC_INT, {time}, {5, 6, 7}), "units", "m3 s-1");
    file.close();

    NetcdfTimeSeries series;
    ASSERT_TRUE(series.open(file.path())) << series.lastError();
    EXPECT_EQ(formatDate(series.startTime().value()), "2001-01-01 06:00");
    EXPECT_THAT(timesOf(series), ElementsAre(0.0, 0.25, 1.25));
    ASSERT_EQ(series.itemCount(), 5);
    EXPECT_EQ(series.itemName(2), "flow[2]");
    EXPECT_EQ(series.itemName(5) + " " + series.itemUnit(5), "count m3 s-1");
    EXPECT_EQ(series.itemUnit(2), "");
    EXPECT_THAT(valuesOf(series, 1), ElementsAre(1.0F, -999999.0F, 3.0F));
    EXPECT_THAT(valuesOf(series, 2), ElementsAre(10.0F, 20.0F, 30.0F));
    EXPECT_THAT(valuesOf(series, 3), ElementsAre(101.0F, 102.0F, -999999.0F));
    EXPECT_THAT(valuesOf(series, 4), ElementsAre(-999999.0F, -999999.0F, 100.0F));  // unwritten, then missing
    EXPECT_THAT(valuesOf(series, 5), ElementsAre(5.0F, 6.0F, 7.0F));
    EXPECT_FALSE(series.getData(6));
    EXPECT_EQ(series.units(2)[2], 30.0 * static_cast<double>(std::numeric_limits<float>::epsilon()));
    EXPECT_EQ(series.units(3)[0], 0.5);
    EXPECT_EQ(series.units(5)[1], 1.0);
    expectSameGuarded(file.path());
  }
}

TEST(NetcdfTimeSeries, MarkersAndLimitsAreComparedAsTheFileHoldsNumbers) {
  using Attribute = std::tuple<const char*, nc_type, std::vector<double>>;
  constexpr float kGap = -999999.0F;
  // The attributes, the numbers stored, and the values read.
  const std::tuple<nc_type, std::vector<Attribute>, std::vector<double>, std::vector<float>> cases[] = {
      {NC_FLOAT, {{"missing_value", NC_DOUBLE, {1e20, -9999.9}}}, {1e20, 5, -9999.9}, {kGap, 5, kGap}},
      {NC_DOUBLE, {{"missing_value", NC_FLOAT, {-9999.9}}}, {-9999.9, -9999.8}, {kGap, -9999.8F}},
      {NC_DOUBLE, {{"missing_value", NC_DOUBLE, {1}}}, {1, 1 + 1e-12}, {kGap, 1}},
      {NC_INT, {{"missing_value", NC_INT, {7}}, {"scale_factor", NC_DOUBLE, {0.1}}}, {7, 70}, {kGap, 7}},
      {NC_INT, {{"missing_value", NC_DOUBLE, {-99.9}}, {"scale_factor", NC_DOUBLE, {0.1}}}, {-999, 70}, {kGap, 7}},
      {NC_FLOAT,
       {{"valid_min", NC_DOUBLE, {0.1}}, {"valid_max", NC_FLOAT, {0.7}}},
       {0.1, 0.7, 0.09, 0.71},
       {0.1F, 0.7F, kGap, kGap}},
      {NC_SHORT,
       {{"valid_range", NC_SHORT, {1, 50}}, {"scale_factor", NC_DOUBLE, {2}}},
       {50, 51, 0},
       {100, kGap, kGap}},
      {NC_SHORT,
       {{"valid_range", NC_DOUBLE, {1, 50}}, {"scale_factor", NC_DOUBLE, {2}}},
       {25, 26, 0},
       {50, kGap, kGap}},
      {NC_SHORT, {{"valid_max", NC_INT, {50}}, {"scale_factor", NC_DOUBLE, {2}}}, {26, 51}, {52, kGap}},
  };
  for (const auto& [type, attributes, stored, expected] : cases) {
    NetcdfFile file("markers.nc");
    const int flow = file.defineFlow(type, stored);
    for (const auto& [name, ofType, numbers] : attributes) file.numbers(flow, name, ofType, numbers);
    file.close();
    NetcdfTimeSeries series;
    ASSERT_TRUE(series.open(file.path())) << series.lastError();
    EXPECT_EQ(valuesOf(series, 1), expected) << ::testing::PrintToString(attributes);
  }
}

TEST(NetcdfTimeSeries, TakesTheTimeVariableThatIsNamedLikeItsDimension) {
  NetcdfFile file("two_times.nc");
  const int time = file.dimension("time", 2);
  file.text(file.variable("forecast", NC_DOUBLE, {time}, {0, 1}), "units", "days since 1900-01-01");
  // A third of a day and three years in days: the start is a whole second although the number is not.
  file.time(time, "days since 1990-1-1", {1096.0 + 1.0 / 3.0, 1097.5});
  file.close();
  NetcdfTimeSeries series;
  ASSERT_TRUE(series.open(file.path())) << series.lastError();
  EXPECT_EQ(formatDate(series.startTime().value()), "1993-01-01 08:00");
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, DoubleNear(7.0 / 6.0, 1e-11)));
  EXPECT_EQ(series.itemCount(), 1);
}

TEST(NetcdfTimeSeries, RefusesByName) {
  const std::string days = "days since 1990-01-01";
  const std::string time = "variable \"time\"";
  const std::tuple<std::string, std::string, std::vector<double>, std::string> cases[] = {
      {days,
       "noleap",
       {0, 1},
       time +
           ": expected the calendar standard, gregorian or proleptic_gregorian, found \"noleap\": its years have "
           "other days than those of the evaluation period; convert the series to the standard calendar, or write it "
           "as CSV, in which every value has its date"},
      {"months since 1990-01-01",
       "",
       {0, 1},
       time + ": expected time units like \"hours since 1990-01-01 00:00\", found \"months since 1990-01-01\""},
      {days, "", {0, 2, 2}, time + ", step 3: expected a time later than 2, found 2"},
      {days, "", {3, 2}, time + ", step 2: expected a time later than 3, found 2"},
      {days, "", {0, NC_FILL_DOUBLE}, time + ", step 2: expected a time, found 9.96"},
      {days, "", {1e300}, time + ", step 1: expected a time, found 1e+300"},
      {"days", "", {0}, "expected a time variable over one dimension with units like"},
  };
  for (const auto& [units, calendar, times, error] : cases) {
    NetcdfFile file("refused.nc");
    const int axis = file.time(file.dimension("time", times.size()), units, times);
    if (!calendar.empty()) file.text(axis, "calendar", calendar);
    file.close();
    NetcdfTimeSeries series;
    EXPECT_FALSE(series.open(file.path())) << error;
    EXPECT_THAT(series.lastError(), HasSubstr(file.path() + ": " + error));
    EXPECT_EQ(series.timeStepCount(), 0);
  }
}

TEST(NetcdfTimeSeries, AValueBeyondSinglePrecisionIsNamed) {
  NetcdfFile file("huge.nc");
  file.writeFlow({0, -1e39});
  NetcdfTimeSeries series;
  ASSERT_TRUE(series.open(file.path())) << series.lastError();
  EXPECT_FALSE(series.getData(1));
  EXPECT_THAT(series.lastError(), HasSubstr("variable \"flow\", step 2: expected a number of at most 3.4028235e38 in "
                                            "size, found -1e+39"));
  expectSameGuarded(file.path());
}

// sound.nc with another byte 2072, from which the library never returns.
TEST(GuardedNetcdf, ADamagedFileIsGivenUpAndTheNextOneIsRead) {
  NetcdfFile counts("counts.nc");
  std::ofstream(counts.path()) << std::string("CDF\1\0\0\0\0\0\0\0\12\x7F\xFF\xFF\xFF", 16) << std::string(300, '\0');
  const auto reading = std::make_shared<SeriesReading>();
  GuardedNetcdf series(reading);
  reading->watch.begin(0.3, "0.3 seconds");
  EXPECT_FALSE(series.open(MIREVO_SOURCE_DIR "/tests/platform/series/endless.nc"));
  EXPECT_THAT(series.lastError(), AnyOf(HasSubstr("endless.nc: reading it took longer than 0.3 seconds"),
                                        HasSubstr("endless.nc: opening")));  // once the library is mended
  reading->watch.end();
  EXPECT_FALSE(series.open(counts.path()));
  EXPECT_THAT(series.lastError(), EndsWith("it ends within its header: it was not written to its end, or is damaged"));
  EXPECT_TRUE(series.open(MIREVO_SOURCE_DIR "/tests/platform/series/sound.nc")) << series.lastError();
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(1.0F, 2.0F, 3.0F, 4.0F, 5.0F));
}

TEST(GuardedNetcdf, AFileWhoseReaderIsKilledIsReadOnceMore) {
  const std::string files = MIREVO_SOURCE_DIR "/tests/platform/series/";
  const TemporaryFolder folder;
  const std::string link = folder / "simulated.nc";
  std::filesystem::create_symlink(files + "endless.nc", link);
  const auto reading = std::make_shared<SeriesReading>();
  bool isKilled = false;
  reading->watch.begin(20.0, "20 seconds", [&] {
    if (isKilled) return;  // a slow machine calls again while the second reader is at work
    std::ifstream children(fmt::format("/proc/self/task/{}/children", ::getpid()));
    for (pid_t child = 0; children >> child;) {
      if (isHelperProcess(child) && ::kill(child, SIGKILL) == 0) isKilled = true;
    }
    if (!isKilled) return;
    std::filesystem::remove(link);
    std::filesystem::create_symlink(files + "sound.nc", link);
  });
  GuardedNetcdf series(reading);
  EXPECT_TRUE(series.open(link)) << series.lastError();
}

TEST(NetcdfTimeSeries, FilesThatAreNoneOrCutOffAreRefused) {
  NetcdfTimeSeries series;
  EXPECT_FALSE(series.open("no_such_folder/q.nc"));
  EXPECT_EQ(series.lastError(), "no_such_folder/q.nc: opening: No such file or directory");
  NetcdfFile file("cut.nc");
  file.writeFlow({0, 1, 2, 3});
  std::filesystem::resize_file(file.path(), std::filesystem::file_size(file.path()) / 2);
  EXPECT_FALSE(series.open(file.path()));
  EXPECT_THAT(series.lastError(), StartsWith(file.path() + ": "));
}

// The library reads zeros beyond the end of a classic file: a run that stopped half-way would count as a good one.
TEST(NetcdfTimeSeries, AClassicFileThatWasNotWrittenToItsEndIsRefused) {
  for (const int format : {0, NC_64BIT_OFFSET, NC_64BIT_DATA}) {
    for (const bool isUnlimited : {false, true}) {
      for (const bool hasTwo : {false, true}) {
        NetcdfFile file("classic.nc", format);
        const int time = file.dimension("time", 3, isUnlimited);
        file.time(time, "days since 1990-01-01", {1, 2, 3});
        if (hasTwo) file.variable("level", NC_SHORT, {time}, {1, 2, 3});
        const int stations = file.dimension("station", 2);
        const int flow = file.variable("flow", NC_DOUBLE, {time, stations}, {1, 2, 3, 4, 5, 6});
        file.number(flow, "scale_factor", NC_DOUBLE, 1.0);
        file.close();
        const auto size = std::filesystem::file_size(file.path());
        NetcdfTimeSeries series;
        ASSERT_TRUE(series.open(file.path())) << series.lastError();
        EXPECT_EQ(series.itemCount(), hasTwo ? 3 : 2);
        for (const std::size_t left : {size - 1, size - 8, size - 40}) {
          std::filesystem::resize_file(file.path(), left);
          EXPECT_FALSE(series.open(file.path())) << format << " " << isUnlimited << " " << left;
          EXPECT_EQ(series.lastError(), file.path() + ": expected " + std::to_string(size) +
                                            " bytes as its header says, found " + std::to_string(left) +
                                            ": it was not written to its end");
        }
      }
    }
  }
}

TEST(NetcdfUnits, OriginsAndCalendars) {
  const std::tuple<const char*, const char*, double, DateRecord> cases[] = {
      {"days since 1990-01-01", "", 86400, {1990, 1, 1}},
      {"Hours Since 1990-1-2 3:04:05", "standard", 3600, {1990, 1, 2, 3, 4, 5}},
      {"minutes since 1970-01-01T00:00:00Z", "proleptic_gregorian", 60, {1970, 1, 1}},
      {"second since 1970-01-01 06:30:00.000 +00:00", "Gregorian", 1, {1970, 1, 1, 6, 30}},
      {"days since 0001-01-01", "proleptic_gregorian", 86400, {1, 1, 1}},
      {"days since 1-1-1", "standard", 86400, {0, 12, 30}},  // the Julian day, two days earlier
      {"days since 1582-10-04", "", 86400, {1582, 10, 14}},
      {"days since 1582-10-15", "", 86400, {1582, 10, 15}},
  };
  std::string reason;
  for (const auto& [text, calendar, secondsPerUnit, origin] : cases) {
    const auto units = parseTimeUnits(text, calendar, reason);
    ASSERT_TRUE(units.has_value()) << text << ": " << reason;
    EXPECT_EQ(units->secondsPerUnit, secondsPerUnit) << text;
    EXPECT_EQ(formatDate(dateOfSecond(units->originSecond)), formatDate(origin)) << text;
  }
  for (const char* bad : {"", "days", "days since", "days since x", "days since 1990", "days since 1990-13-01",
                          "days since 1990-02-29", "days since 1990-01-01 00:00 +01:00", "days since 1990-01-01 25:00",
                          "years since 1990-01-01", "days before 1990-01-01", "days since 1990-01-01 00:00:00.5",
                          "days since -1-01-01", "days since 1990-01-01T"}) {
    EXPECT_FALSE(parseTimeUnits(bad, "", reason).has_value()) << bad;
    EXPECT_THAT(reason, HasSubstr("expected time units like"));
  }
}

}  // namespace
}  // namespace mirevo

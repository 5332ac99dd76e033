// The rainfall-runoff model of the examples against the published equations and against conservation of mass.
#define GR4J_WITHOUT_MAIN
#include "models/gr4j_cemaneige.cpp"  // NOLINT(bugprone-suspicious-include): a model is one file, and this its test

#include <cstdlib>
#include <filesystem>
#include <numeric>

#include <gtest/gtest.h>

namespace gr4j {
namespace {

TEST(SolidFraction, GoesFromAllToNothingAsTheDayThaws) {
  EXPECT_EQ(solidFraction(-8.0, -1.0), 1.0);
  EXPECT_EQ(solidFraction(-8.0, 0.0), 1.0);
  EXPECT_DOUBLE_EQ(solidFraction(-3.0, 1.0), 0.75);
  EXPECT_DOUBLE_EQ(solidFraction(-1.0, 3.0), 0.25);
  EXPECT_EQ(solidFraction(0.0, 0.0), 1.0);
  EXPECT_EQ(solidFraction(0.0, 5.0), 0.0);
}

TEST(UnitHydrograph, OrdinatesSumToOneForAnyTimeBase) {
  for (const double x4 : {0.01, 0.5, 0.9, 1.0, 1.04, 1.5, 2.0, 2.0000001, 7.3, 100.0}) {
    const Gr4j model(Parameters{.x4 = x4});
    for (const auto& ordinates : {model.hydrograph1().ordinates(), model.hydrograph2().ordinates()}) {
      EXPECT_NEAR(std::accumulate(ordinates.begin(), ordinates.end(), 0.0), 1.0, 1e-14) << x4;
      for (const double ordinate : ordinates) EXPECT_GE(ordinate, 0.0) << x4;
    }
  }
}

struct ExpectedDay {
  double precipitation, pet, runoff, evapotranspiration, exchange, production, routing;
};

// Computed apart from this program from the equations as they are published, the unit hydrographs as sums over the
// past.
TEST(Gr4j, FollowsThePublishedEquationsDayByDay) {
  const std::vector<std::pair<double, std::vector<ExpectedDay>>> cases{
      {0.8,
       {{20, 3, 0.755481834373497, 3, 0.141421356237316, 105.179908918507, 40.013403183093},
        {0, 4, 0.875794672626877, 2.29312567526305, 0.14158728164657, 102.872903661432, 40.4435836978385},
        {55, 1, 1.20231971090359, 1, 0.146986936346919, 147.218669419171, 42.7583478668375},
        {0, 0, 2.20533458075353, 0, 0.178598675977383, 147.135507255837, 46.9113679475206},
        {2, 2, 1.62402527926998, 2, 0.247046308397613, 147.052579449868, 45.7911314053267}}},
      // The exchange takes more than the direct branch has, then more than both have.
      {-1.5, {{1, 5, 0.592208376784166, 3.02101740828088, -0.132697676558545, 87.9726359896708, 39.2772818932926}}},
      {-500.0, {{1, 5, 0.0, 3.02101740828088, -40.0021879466353, 87.9726359896708, 0.0}}},
  };
  for (const auto& [x2, days] : cases) {
    Gr4j model(Parameters{.x1 = 300.0, .x2 = x2, .x3 = 80.0, .x4 = 1.5});
    for (const ExpectedDay& day : days) {
      SCOPED_TRACE(testing::Message() << "X2 " << x2 << ", P " << day.precipitation);
      const Fluxes fluxes = model.advance(day.precipitation, day.pet);
      EXPECT_NEAR(fluxes.runoff, day.runoff, 1e-11);
      EXPECT_NEAR(fluxes.evapotranspiration, day.evapotranspiration, 1e-11);
      EXPECT_NEAR(fluxes.exchange, day.exchange, 1e-11);
      EXPECT_NEAR(model.production(), day.production, 1e-11);
      EXPECT_NEAR(model.routing(), day.routing, 1e-11);
    }
  }
}

// CTG 0.5, Kf 4, full cover at 0.9 * 100 mm. Thermal state and melt worked out by hand.
TEST(SnowPack, MeltsOnlyOnceItIsWarmAndSlowerWhereCoverIsPatchy) {
  SnowPack snow(Parameters{.ctg = 0.5, .kf = 4.0}, 100.0);
  EXPECT_EQ(snow.advance({45.0, 0.0, -6.0, -2.0}), 0.0);  // T -4: all snow, eTG = -2
  EXPECT_DOUBLE_EQ(snow.thermalState(), -2.0);
  EXPECT_DOUBLE_EQ(snow.water(), 45.0);
  EXPECT_EQ(snow.advance({0.0, 0.0, 0.0, 2.0}), 0.0);  // T 1, but eTG = -1 + 0.5 is below zero still
  EXPECT_DOUBLE_EQ(snow.thermalState(), -0.5);
  // T 3: eTG = min(0, -0.25 + 1.5) = 0; potential 12 mm, cover 45/90: 12 (0.9 * 0.5 + 0.1) = 6.6 mm. Rain passes.
  EXPECT_DOUBLE_EQ(snow.advance({5.0, 0.0, 1.0, 5.0}), 5.0 + 6.6);
  EXPECT_DOUBLE_EQ(snow.water(), 45.0 - 6.6);
  // T 20: the potential melt is all there is, 38.4 mm, cover 38.4/90.
  EXPECT_DOUBLE_EQ(snow.advance({0.0, 0.0, 15.0, 25.0}), 38.4 * (0.9 * 38.4 / 90.0 + 0.1));
}

std::vector<Forcing> variedWeather(int count) {
  std::vector<Forcing> days;
  unsigned state = 12345;
  const auto uniform = [&state] { return (state = state * 1664525u + 1013904223u) / 4294967296.0; };
  for (int i = 0; i < count; ++i) {
    const double season = std::sin(i * 2.0 * 3.14159265358979 / 365.25);
    const double mean = 5.0 + 15.0 * season + 8.0 * (uniform() - 0.5);
    const double wet = uniform() < 0.4 ? 20.0 * uniform() * uniform() : 0.0;
    days.push_back({i % 700 == 0 ? 120.0 : wet, std::max(0.0, 2.0 + 2.5 * season), mean - 5.0, mean + 5.0});
  }
  return days;
}

TEST(Model, KeepsEveryMillimetre) {
  const std::vector<Forcing> days = variedWeather(4000);
  const std::vector<Parameters> cases{
      {},
      {.x1 = 50.0, .x2 = -5.0, .x3 = 10.0, .x4 = 0.5, .ctg = 0.0, .kf = 1.0},
      {.x1 = 2000.0, .x2 = 5.0, .x3 = 500.0, .x4 = 5.0, .ctg = 1.0, .kf = 10.0},
      {.x1 = 0.01, .x2 = -1000.0, .x3 = 0.01, .x4 = 0.01, .ctg = 0.9, .kf = 0.0},
  };
  for (const Parameters& parameters : cases) {
    SnowPack snow(parameters, meanAnnualSolidPrecipitation(days));
    Gr4j model(parameters);
    for (const Forcing& day : days) {
      const double before = snow.water() + model.stored();
      const Fluxes fluxes = model.advance(snow.advance(day), day.pet);
      const double gained = day.precipitation + fluxes.exchange - fluxes.evapotranspiration - fluxes.runoff;
      ASSERT_NEAR(snow.water() + model.stored() - before, gained, 1e-9) << "X1 " << parameters.x1;
      ASSERT_GE(fluxes.runoff, 0.0);
      ASSERT_GE(snow.water(), 0.0);
      ASSERT_LE(model.production(), parameters.x1);
    }
  }
}

TEST(Model, RunsDryWithoutWeather) {
  const std::vector<Forcing> days(20000);
  const std::vector<DailyResult> results = simulate({.x1 = 100.0, .x3 = 50.0}, days);
  double total = 0.0;
  for (const DailyResult& day : results) {
    EXPECT_EQ(day.snowWater, 0.0);
    EXPECT_EQ(day.evapotranspiration, 0.0);
    total += day.runoff;
  }
  EXPECT_LT(results.back().runoff, 1e-3);
  EXPECT_LT(total, 0.3 * 100.0 + 0.5 * 50.0);  // what the stores began with
}

class ModelFiles : public testing::Test {
 protected:
  void SetUp() override {
    std::string pattern = (std::filesystem::temp_directory_path() / "gr4j_test_XXXXXX").string();
    ASSERT_NE(mkdtemp(pattern.data()), nullptr);
    folder_ = pattern;
  }
  void TearDown() override { std::filesystem::remove_all(folder_); }

  std::string write(const std::string& name, const std::string& content) const {
    const std::string path = folder_ / name;
    std::ofstream(path) << content;
    return path;
  }

  /// What is wrong with the run, without the folder; empty when it succeeds.
  std::string runWith(const std::string& parameters, const std::string& forcing) const {
    try {
      run(write("p.txt", parameters), write("f.csv", forcing), folder_ / "s.csv");
    } catch (const std::exception& error) {
      return std::string(error.what()).substr(folder_.string().size() + 1);
    }
    return "";
  }

  std::filesystem::path folder_;
};

constexpr const char* kParameters = "X1=300\nX2 = 0 # none\n\nX3=80\nX4=1.5\r\nCTG=2.5E-01\nKf=4\narea_km2 = 86.4\n";
constexpr const char* kForcing =
    "# comment\ntmax_degC,time,flag,precipitation_mm,pet_mm,tmin_degC\n"
    "9,2001-01-01,A,20,3,5\n9,2001-01-02,A,0,4,5\n9,2001-01-03,A,55,1,5\n";

TEST_F(ModelFiles, SimulatesTheDaysAskedFor) {
  ASSERT_EQ(runWith(kParameters, kForcing), "");
  const std::string all = readFile(folder_ / "s.csv");
  EXPECT_EQ(std::count(all.begin(), all.end(), '\n'), 4);
  EXPECT_TRUE(all.starts_with(std::string(kOutputHeader) + "2001-01-01,"));
  EXPECT_EQ(runWith(std::string(kParameters) + "start = 2001-01-02\nend = 2001-01-02", kForcing), "");
  const std::string one = readFile(folder_ / "s.csv");
  EXPECT_EQ(std::count(one.begin(), one.end(), '\n'), 2);
  EXPECT_NE(one.find("\n2001-01-02,"), std::string::npos);
}

TEST_F(ModelFiles, RefusesWhatItCannotUseByFileAndLineAndLeavesTheLastResult) {
  ASSERT_EQ(runWith(kParameters, kForcing), "");
  const std::string before = readFile(folder_ / "s.csv");
  const std::string p = kParameters;
  const std::string f = kForcing;
  const std::vector<std::array<std::string, 3>> cases{
      {"X1=300\n", f, "p.txt: 'X2' is missing"},
      {p + "X1=300\n", f, "p.txt:9: 'X1' is given a second time"},
      {p + "X5=1\n", f, "p.txt:9: unknown name 'X5'"},
      {p + "X5\n", f, "p.txt:9: expected 'name = value'"},
      {p + "start=2001\n", f, "p.txt:9: expected a date such as 2001-01-31"},
      {p + "start=2002-01-01\n", f, "f.csv: no day from 2002-01-01 to 9999-99-99"},
      {"X1 = **********\n", f, "p.txt:1: expected a number, found '**********'"},
      {"X1 = nan\n", f, "p.txt:1: expected a number, found 'nan'"},
      {"X1 = -3\n", f, "p.txt:1: 'X1' is out of its range"},
      {p, "", "f.csv: cannot be read, or is empty"},
      {p, "time,pet_mm\n", "f.csv:1: no column 'precipitation_mm'"},
      {p, f + "9,2001-01-04,A,0,4", "f.csv:6: the row is cut short"},
      {p, f + "9,2001-01-04,A,,4,5", "f.csv:6: expected a number, found ''"},
      {p, f + "9,2001-01-04,A,-999,4,5", "f.csv:6: precipitation and pet cannot be negative"},
      {p, f + "4,2001-01-04,A,0,4,5", "f.csv:6: tmin is above tmax"},
  };
  for (const auto& [parameters, forcing, message] : cases) {
    EXPECT_EQ(runWith(parameters, forcing), message);
    EXPECT_EQ(readFile(folder_ / "s.csv"), before) << message;
  }
}

}  // namespace
}  // namespace gr4j

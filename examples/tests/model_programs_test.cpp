// The programs of the example models: what they read, write and refuse.
#include "models/model_programs.h"

#include <algorithm>
#include <array>
#include <vector>

#include <gtest/gtest.h>

#include "temporary_folder.h"

namespace models {
namespace {

class ModelFiles : public testing::Test {
 protected:
  /// The error message of the run, without the folder; empty if it succeeds.
  template <typename Run>
  std::string complaint(Run run) const {
    try {
      run();
    } catch (const std::exception& error) {
      return std::string(error.what()).substr(folder_.path().size() + 1);
    }
    return "";
  }
  std::string runWith(const std::string& parameters, const std::string& forcing) const {
    const std::string p = folder_.write("p.txt", parameters);
    const std::string f = folder_.write("f.csv", forcing);
    return complaint([&] { runCatchment(p, f, folder_ / "s.csv"); });
  }
  std::string routeWith(const std::string& parameters, const std::string& upstream, const std::string& lateral) const {
    const std::string p = folder_.write("p.txt", parameters);
    const std::string u = folder_.write("u.csv", "time,discharge_m3s\n" + upstream);
    const std::string l = folder_.write("l.csv", "time,other,discharge_m3s\n" + lateral);
    return complaint([&] { runRiver(p, u, l, folder_ / "r.csv"); });
  }

  mirevo::TemporaryFolder folder_;
};

constexpr const char* kParameters = "X1=300\nX2 = 0 # none\n\nX3=80\nX4=1.5\r\nCTG=2.5E-01\nKf=4\narea_km2 = 86.4\n";
constexpr const char* kForcing =
    "# comment\ntmax_degC,time,flag,precipitation_mm,pet_mm,tmin_degC\n"
    "9,2001-01-01,A,20,3,5\n9,2001-01-02,A,0,4,5\n9,2001-01-03,A,55,1,5\n";

TEST_F(ModelFiles, SimulatesTheDaysAskedFor) {
  ASSERT_EQ(runWith(kParameters, kForcing), "");
  const std::string all = folder_.read("s.csv");
  EXPECT_EQ(std::count(all.begin(), all.end(), '\n'), 4);
  EXPECT_TRUE(all.starts_with(std::string(kCatchmentHeader) + "2001-01-01,"));
  EXPECT_EQ(runWith(std::string(kParameters) + "start = 2001-01-02\nend = 2001-01-02", kForcing), "");
  const std::string one = folder_.read("s.csv");
  EXPECT_EQ(std::count(one.begin(), one.end(), '\n'), 2);
  EXPECT_NE(one.find("\n2001-01-02,"), std::string::npos);
}

TEST_F(ModelFiles, RefusesWhatItCannotUseByFileAndLineAndLeavesTheLastResult) {
  ASSERT_EQ(runWith(kParameters, kForcing), "");
  const std::string before = folder_.read("s.csv");
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
      {p, "time,precipitation_mm,pet_mm,tmin_degC\n", "f.csv:1: no column 'tmax_degC'"},
  };
  for (const auto& [parameters, forcing, message] : cases) {
    EXPECT_EQ(runWith(parameters, forcing), message);
    EXPECT_EQ(folder_.read("s.csv"), before) << message;
  }
}

// 2.3 days and X = 0.15 as in the published flood: 0.0631 I(j+1) + 0.3442 I(j) + 0.5927 O(j).
TEST_F(ModelFiles, RoutesTheUpstreamDischargeAndAddsTheLateralOfTheSameDays) {
  const std::string upstream = "2001-01-01,93\n2001-01-02,137\n";
  const std::string lateral = "2001-01-01,x,1\n2001-01-02,x,2.5\n";
  const std::string reach = "K = 2.3\nX = 0.15\n";
  ASSERT_EQ(routeWith(reach, upstream, lateral), "");
  EXPECT_EQ(folder_.read("r.csv"), std::string(kRiverHeader) + "2001-01-01,94,93,1\n2001-01-02,98.278,95.778,2.5\n");
  const std::vector<std::array<std::string, 4>> cases{
      {reach, upstream, "2001-01-01,x,1\n", "l.csv: ends before 2001-01-02"},
      {reach, upstream, "2001-01-02,x,1\n", "l.csv:2: expected the day 2001-01-01"},
      {reach, upstream, lateral + "2001-01-03,x,1\n", "l.csv:4: is a day that "},
      {reach, "2001-01-01,\n", lateral, "u.csv:2: expected a number, found ''"},
      {"K = 0\nX = 0.2\n", upstream, lateral, "p.txt:1: 'K' is out of its range"},
      {"K = 1\nX = 0.5\n", upstream, lateral, "p.txt:2: 'X' is out of its range"},
  };
  for (const auto& [parameters, up, side, message] : cases) {
    EXPECT_EQ(routeWith(parameters, up, side).substr(0, message.size()), message);
  }
}

}  // namespace
}  // namespace models

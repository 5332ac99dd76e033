#include <algorithm>
#include <cmath>
#include <cstdlib>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "common/text.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The number in the column `heading` of the first row that begins with these cells; NaN where there is none.
double cellOf(const std::string& text, const std::vector<std::string>& first, const std::string& heading) {
  const ReadTable table = readDataTable(text);
  for (const std::vector<std::string>& cells : table.rows) {
    if (!std::equal(first.begin(), first.end(), cells.begin())) continue;
    return realCell(cells.at(table.column(heading).value())).value();
  }
  return std::nan("");
}

TEST(LocalSensitivity, OfALinearModelGivesTheCovarianceOfItsClosedForm) {
  const ModelFolder folder;
  const ProgramResult run = runProgram({folder.writeSetup({.option = 1})});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const std::string results = folder.read("basin_Sensitivity.dat");
  const auto rows = readDataTable(results).rows;
  ASSERT_EQ(rows.size(), 5U);  // base, two sets a parameter
  EXPECT_EQ(rows[0][2], "4");
  EXPECT_EQ(rows[2][2], "4.02");

  // simulated = a + b sin(t / 58) + ...; the observations have a = 5, b = 2, the base set a = 4, b = 1.
  double s = 0.0;
  double ss = 0.0;
  double squares = 0.0;
  for (int t = 0; t < 365; ++t) {
    const double sine = std::sin(t / 58.0);
    s += sine;
    ss += sine * sine;
    squares += (1.0 + sine) * (1.0 + sine);
  }
  const double variance = squares / 363.0;
  const double determinant = 365.0 * ss - s * s;
  const double deviationA = std::sqrt(variance * ss / determinant);
  const double deviationB = std::sqrt(variance * 365.0 / determinant);
  const double t = 1.966521;  // 97.5 % quantile of Student's t with 363 degrees of freedom
  const std::string limits = folder.read("basin_ParameterLimits.dat");
  EXPECT_NEAR(cellOf(limits, {"a"}, "StandardDeviation") / deviationA, 1.0, 2e-5);
  EXPECT_NEAR(cellOf(limits, {"b"}, "StandardDeviation") / deviationB, 1.0, 2e-5);
  EXPECT_NEAR(cellOf(limits, {"a"}, "Lower95"), 4.0 - t * deviationA, 1e-6);
  EXPECT_NEAR(cellOf(limits, {"b"}, "Upper95"), 1.0 + t * deviationB, 1e-6);
  EXPECT_NEAR(cellOf(folder.read("basin_Correlation.dat"), {"a"}, "b"), -s / std::sqrt(365.0 * ss), 1e-5);
  const std::string covariance = folder.read("basin_Covariance.dat");
  EXPECT_NEAR(cellOf(covariance, {"b"}, "a"), -variance * s / determinant, 1e-7);
  const ReadTable jacobian = readDataTable(folder.read("basin_Jacobian.dat"));
  ASSERT_EQ(jacobian.columns, (std::vector<std::string>{"Measure", "Time", "Weight", "Residual", "a", "b"}));
  ASSERT_EQ(jacobian.rows.size(), 365U);
  EXPECT_EQ(jacobian.rows[1][1], "2001-01-02T00:00:00");
  for (int day = 0; day < 365; ++day) {
    const double sine = std::sin(day / 58.0);
    const double expected[] = {1.0, -1.0 - sine, 1.0, sine};
    for (std::size_t i = 0; i < 4; ++i) {
      EXPECT_NEAR(*realCell(jacobian.rows[static_cast<std::size_t>(day)][i + 2]), expected[i], 1e-4) << day << " " << i;
    }
  }
  // d RMSE / da = mean(-1 - sine) / RMSE
  const double rmse = std::sqrt(squares / 365.0);
  EXPECT_NEAR(cellOf(folder.read("basin_Sensitivities.dat"), {"a", "objective", "fit"}, "Derivative"),
              -(1.0 + s / 365.0) / rmse, 1e-4);
  EXPECT_THAT(results, ::testing::ContainsRegex("#.*1\\. a"));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\nParameter covariance: 365 observations, 2 parameters, 363 "));
}

TEST(LocalSensitivity, WeighsEachObservationByItsOwnError) {
  const ModelFolder folder;
  const std::string before = folder.read("observed.csv");
  std::string observed;
  for (const std::string_view line : splitLines(before)) {
    const char* more = line.starts_with("2001-01") ? ",0,9" : ",0.5,0";
    observed += fmt::format("{}{}\n", line, observed.empty() ? ",error,code" : more);
  }
  folder.write("observed.csv", observed);
  const std::string setup = folder.writeSetup({.option = 1});
  folder.editSetup("'observed.csv'", "'observed.csv'\nError_Item_No = 2\nQuality_Item_No = 3\nQuality_Left_Out = 9");
  const ProgramResult run = runProgram({setup});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const ReadTable jacobian = readDataTable(folder.read("basin_Jacobian.dat"));
  ASSERT_EQ(jacobian.rows.size(), 334U);
  EXPECT_EQ(jacobian.rows[0][1], "2001-02-01T00:00:00");
  EXPECT_EQ(jacobian.rows[0][2], "4");
}

TEST(LocalSensitivity, TakesAnObservationOnceHoweverItsItemIsWritten) {
  const std::pair<const char*, const char*> cases[] = {
      // in both measures, and then in the first one
      {"'model/simulated.csv'\n          Item_No = 1", "'model/simulated.csv'\nItem_Name = 'simulated'"},
      {"'model/simulated.csv'\n          Item_No = 1", "'model/simulated.csv'\nItem_No = 1\nItem_Name = 'Simulated'"},
      {"'observed.csv'", "'observed.csv'\nHeader_Rows = 1"},
      {"'observed.csv'", "'observed.csv'\nMissing_Value = -99"},
  };
  for (const auto& [first, second] : cases) {
    SCOPED_TRACE(second);
    const ModelFolder folder;
    const std::string setup = folder.writeSetup({.option = 1});
    folder.addMeasure("again", "");
    folder.editSetup(first, second);
    const ProgramResult run = runProgram({setup});
    ASSERT_EQ(run.exitCode, 0) << run.error;
    EXPECT_THAT(folder.read("basin.log"), HasSubstr("\nParameter covariance: 365 observations, 2 parameters, 363 "));
  }
}

TEST(LocalSensitivity, TakesAnObservationOnceFromTheFirstMeasureThatHasASimulatedValue) {
  const ModelFolder folder;
  std::string observed;
  const std::string before = folder.read("observed.csv");
  for (const std::string_view line : splitLines(before)) {
    const bool isMoved = line.starts_with("2001-01") || line.starts_with("2001-02");  // between two steps
    const std::size_t comma = line.find(',');
    observed += fmt::format("{}{}{}\n", line.substr(0, comma), isMoved ? " 12:00" : "", line.substr(comma));
  }
  folder.write("observed.csv", observed);
  const std::string setup = folder.writeSetup({.option = 1});
  folder.addMeasure("other", "");
  folder.editSetup("[MEASURE_1]", "[MEASURE_1]\nTime_Match = 'exact'");
  const ProgramResult run = runProgram({setup});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  std::map<std::string, int> counts;
  for (const auto& row : readDataTable(folder.read("basin_Jacobian.dat")).rows) ++counts[row[0]];
  EXPECT_EQ(counts, (std::map<std::string, int>{{"flow", 306}, {"other", 59}}));
}

// Interpolated values have all digits, however coarse those that the model prints.
TEST(LocalSensitivity, KnowsTheRoundingOfValuesBetweenTheObservations) {
  const ModelFolder folder;
  std::string observed = "time,observed\n";
  std::string times;
  for (int day = 1; day <= 336; ++day) {
    const std::string date = fmt::format("2001-{:02}-{:02}", (day - 1) / 28 + 1, (day - 1) % 28 + 1);
    observed += fmt::format("{} 07:00,{}\n", date, day % 7);
    times += date + "\n";
  }
  folder.write("observed.csv", observed);
  folder.write("model/times.txt", times);
  folder.write("model/run.sh",
               "#!/bin/sh\nawk '/^[ab] =/ { sum += $3 } END { print \"time,simulated\"\n"
               "  while ((getline day <\"times.txt\") > 0) printf \"%s,%.3f\\n\", day, 3 + sum * sin(++n / 7) }' "
               "parameters.txt >simulated.csv\n",
               0755);
  ASSERT_EQ(runProgram({folder.writeSetup({.option = 1})}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Parameter b is left out of the covariance matrix: its effect cannot "
                                                  "be told from that of the parameters before it"));
}

/// A row of the list of parameters: `value` from 0 to 10,000.
std::string parameterSection(std::size_t i, const std::string& value) {
  return fmt::format(
      "[PARAMETER_{0}]\nInitial_Value = {1}\nLower_Bound = 0\nUpper_Bound = 1E4\nTransformation_Type = 0\n"
      "Parameter_Type = 0\nParameter_IDValue = {0}.5E-035\nParameter_Name = 'b{0}'\nParameter_Equation = ''\n"
      "Comment = ''\n[Keywords]\n[/Keywords]\n[/PARAMETER_{0}]\n",
      i, value);
}

/// Puts these sections in the place of the parameters of the setup.
void useParameters(const ModelFolder& folder, std::size_t count, const std::string& sections) {
  std::string text = folder.read("basin.kdx");
  const auto from = text.find("TqSEKdxListItemCount", text.find("[MODEL_PARAMETERS]"));
  text.replace(from, text.find("[INTERNAL_CONSTRAINTS]") - from,
               fmt::format("TqSEKdxListItemCount = {}\n{}", count, sections));
  folder.write("basin.kdx", text);
}

/// A regression problem with certified results.
struct CertifiedProblem {
  const char* formula;                                    ///< of b[1], b[2], ... and x, for awk
  std::string data;                                       ///< x and y, and so on
  std::vector<std::pair<std::string, double>> certified;  ///< the parameters and their standard deviations
};

/// Runs the analysis at the certified parameters and returns their standard deviations.
std::vector<double> deviationsOf(const CertifiedProblem& problem, const std::string& fraction) {
  const ModelFolder folder;
  std::string observed = "time,y\n";
  std::string times;
  std::string texts;
  std::string lines = "!\n";
  std::istringstream data(problem.data);
  std::string x;
  std::string y;
  for (int i = 0; data >> x >> y; ++i) {
    observed += fmt::format("2001-{:02}-{:02},{}\n", i / 28 + 1, i % 28 + 1, y);
    times += fmt::format("2001-{:02}-{:02} {}\n", i / 28 + 1, i % 28 + 1, x);
  }
  for (std::size_t i = 1; i <= problem.certified.size(); ++i) {
    texts += parameterSection(i, problem.certified[i - 1].first);
    lines += fmt::format("!b{}               !\n", i);
  }
  folder.write("observed.csv", observed);
  folder.write("model/x.txt", times);
  folder.write("model/parameters.tpl", lines);
  folder.write(
      "model/run.sh",
      fmt::format("#!/bin/sh\nawk 'function single(y, e) {{ e = 2 ^ (23 - int(log(y) / log(2) + 99) + 99)\n"
                  "  return int(y * e + 0.5) / e }}\n"
                  "function shortest(y, p) {{ for (p = 1; single(sprintf(\"%.\" p \"g\", y) + 0) != y; p++); return "
                  "sprintf(\"%.\" p \"g\", y) }}\n"
                  "BEGIN {{ while ((getline line < \"parameters.txt\") > 0) b[++n] = line + 0\n"
                  "  print \"time,y\"\n  while ((getline line < \"x.txt\") > 0) {{ split(line, word, \" \")\n"
                  "    x = word[2] + 0; printf \"%s,%.17g\\n\", word[1], {} }} }}' >simulated.csv\n",
                  problem.formula),
      0755);
  const std::string setup = folder.writeSetup({.option = 1});
  useParameters(folder, problem.certified.size(), texts);
  folder.editSetup("Fraction = 0.005", "Fraction = " + fraction);
  const ProgramResult run = runProgram({setup});
  EXPECT_EQ(run.exitCode, 0) << run.error;
  std::vector<double> deviations;
  const std::string limits = folder.read("basin_ParameterLimits.dat");
  for (std::size_t i = 1; i <= problem.certified.size(); ++i) {
    deviations.push_back(cellOf(limits, {fmt::format("b{}", i)}, "StandardDeviation"));
  }
  return deviations;
}

// Data and certified values: Statistical Reference Datasets, nonlinear regression, National Institute of Standards and
// Technology (public domain), data sets Misra1a and Thurber.
TEST(LocalSensitivity, ReproducesCertifiedStandardDeviations) {
  const CertifiedProblem problems[] = {
      {"b[1] * (1 - exp(-b[2] * x))",
       "77.6 10.07  114.9 14.73  141.1 17.94  190.8 23.93  239.9 29.61  289.0 35.18  332.8 40.02  378.4 44.82  "
       "434.8 50.76  477.3 55.05  536.8 61.01  593.1 66.40  689.1 75.47  760.0 81.78",
       {{"2.3894212918E+02", 2.7070075241E+00}, {"5.5015643181E-04", 7.2668688436E-06}}},
      {"(b[1] + b[2]*x + b[3]*x*x + b[4]*x*x*x) / (1 + b[5]*x + b[6]*x*x + b[7]*x*x*x)",
       "-3.067 80.574  -2.981 84.248  -2.921 87.264  -2.912 87.195  -2.840 89.076  -2.797 89.608  "
       "-2.702 89.868  -2.699 90.101  -2.633 92.405  -2.481 95.854  -2.363 100.696  -2.322 101.060  "
       "-1.501 401.672  -1.460 390.724  -1.274 567.534  -1.212 635.316  -1.100 733.054  -1.046 759.087  "
       "-0.915 894.206  -0.714 990.785  -0.566 1090.109  -0.545 1080.914  -0.400 1122.643  -0.309 1178.351  "
       "-0.109 1260.531  -0.103 1273.514  0.010 1288.339  0.119 1327.543  0.377 1353.863  0.790 1414.509  "
       "0.963 1425.208  1.006 1421.384  1.115 1442.962  1.572 1464.350  1.841 1468.705  2.047 1447.894  "
       "2.200 1457.628",
       {{"1.2881396800E+03", 4.6647963344E+00},
        {"1.4910792535E+03", 3.9571156086E+01},
        {"5.8323836877E+02", 2.8698696102E+01},
        {"7.5416644291E+01", 5.5675370270E+00},
        {"9.6629502864E-01", 3.1333340687E-02},
        {"3.9797285797E-01", 1.4984928198E-02},
        {"4.9727297349E-02", 6.5842344623E-03}}}};
  for (const CertifiedProblem& problem : problems) {
    for (const char* fraction : {"1e-4", "1e-6"}) {
      const std::vector<double> deviations = deviationsOf(problem, fraction);
      for (std::size_t i = 0; i < deviations.size(); ++i) {
        EXPECT_NEAR(deviations[i] / problem.certified[i].second, 1.0, 1e-6) << "b" << i + 1 << " at " << fraction;
      }
    }
  }
}

TEST(Correlation, OfMoreThanTenParametersIsATableOfItsOwnWithItsLargestEntriesInLogAndReport) {
  constexpr std::size_t kCount = 11;
  const ModelFolder folder;
  std::string lines = "!\n";
  std::string parameters;
  std::string distributions = "    [/PARAMETER_2]\n";
  for (std::size_t i = 1; i <= kCount; ++i) {
    lines += fmt::format("!b{}               !\n", i);
    parameters += parameterSection(i, "5");
    if (i < 3) continue;
    distributions += fmt::format("[PARAMETER_{0}]\nMean_Value = 5\nStandard_Deviation = 1\n[/PARAMETER_{0}]\n", i);
  }
  folder.write("model/parameters.tpl", lines);
  folder.write("model/run.sh",
               "#!/bin/sh\nawk '{ b[NR] = $1 } END { print \"time,y\"\n"
               "  for (t = 1; t <= 28; ++t) { y = 0; for (i = 1; i <= NR; ++i) y += b[i] * cos(i * t)\n"
               "    printf \"2001-01-%02d,%.17g\\n\", t, y } }' parameters.txt >simulated.csv\n",
               0755);
  const std::pair<int, const char*> cases[] = {{1, "basin_Correlation.dat"}, {3, "basin_SampleCorrelation.dat"}};
  for (const auto& [option, file] : cases) {
    const std::string setup = folder.writeSetup({.option = option});
    useParameters(folder, kCount, parameters);
    folder.editSetup("    [/PARAMETER_2]\n  [/UNCERTAINTY", distributions + "  [/UNCERTAINTY");
    const ProgramResult run = runProgram({setup});
    ASSERT_EQ(run.exitCode, 0) << run.error << folder.read("basin.log");
    const std::string told = fmt::format("All correlations of the 11 parameters are in {}", file);
    const std::string results = folder.read(RunSettings{.option = option}.resultFile());
    EXPECT_EQ(occurrences(folder.read("basin.log"), told), 1);
    EXPECT_EQ(occurrences(results, told), 1);
    EXPECT_FALSE(std::isnan(cellOf(folder.read(file), {"b11"}, "b1")));
    if (option != 1) continue;
    EXPECT_THAT(results, HasSubstr("The covariance of the 11 parameters (search scale) is in basin_Covariance.dat"));
    if (!folder.exists("basin_Report.html")) continue;  // in a build without its page
    EXPECT_THAT(folder.read("basin_Report.html"),
                ::testing::ContainsRegex("\"correlation\":\\[\\],\"largestCorrelations\":\\[\\{\"first\":\"b"));
  }
}

// A step of 1e-7 changes a root mean square less than 32 bits can tell.
TEST(LocalSensitivity, HasDerivativesOfMeasuresIn64BitsHoweverItIsRun) {
  const ModelFolder folder;
  std::string observed = "time,observed\n";
  for (int day = 1; day <= 28; ++day) observed += fmt::format("2001-01-{:02},0\n", day);
  folder.write("observed.csv", observed);
  folder.write("model/run.sh",
               "#!/bin/sh\nawk '/^[ab] =/ { b[++n] = $3 } END { print \"time,y\"\n"
               "  for (t = 1; t <= 28; ++t) printf \"2001-01-%02d,%.17g\\n\", t, b[1] + b[2] * t }' "
               "parameters.txt >simulated.csv\n",
               0755);
  double rms = 0.0;
  double product = 0.0;
  for (int t = 1; t <= 28; ++t) {
    rms += (4.0 + t) * (4.0 + t) / 28.0;
    product += (4.0 + t) / 28.0;
  }
  const double derivative = product / std::sqrt(rms);  // by a, which is 4; b is 1
  std::string expected;
  for (const bool isJob : {false, true}) {
    for (const int slots : {1, 3}) {
      if (isJob && (slots == 1 || !mpirunIsInstalled())) continue;
      const std::string setup = folder.writeSetup({.option = 1, .slots = slots});
      folder.editSetup("Fraction = 0.005", "Fraction = 1E-7");
      folder.editSetup("Covmatrix = 1", "Covmatrix = 0");
      const ProgramResult run = isJob ? startJob(3, {setup}).wait() : runProgram({setup});
      ASSERT_EQ(run.exitCode, 0) << run.error;
      const std::string found = folder.read("basin_Sensitivities.dat");
      if (expected.empty()) expected = found;
      EXPECT_EQ(found, expected) << isJob << " " << slots;
    }
  }
  for (const char* kind : {"measure", "objective"}) {
    EXPECT_NEAR(cellOf(expected, {"a", kind}, "Derivative"), derivative, 1e-7) << kind;
  }
  const std::string results = folder.read("basin_Sensitivity.dat");
  const double inRows = (cellOf(results, {"3"}, "fit") - cellOf(results, {"2"}, "fit")) / 8e-7;
  EXPECT_GT(std::abs(inRows - derivative), 0.1) << "else the test tells nothing";
  const std::string report = folder.exists("basin_Report.html") ? folder.read("basin_Report.html") : "";
  const std::string key = "\"derivatives\":[[";
  if (const auto at = report.find(key); at != std::string::npos) {
    EXPECT_NEAR(std::strtod(report.c_str() + at + key.size(), nullptr), derivative, 1e-6);
  }

  folder.editSetup("Restart = 0", "Restart = 1");
  folder.write("basin_Sensitivity.dat", results.substr(0, results.find("\n3\t") + 1));
  std::filesystem::remove(folder / "basin_Sensitivities.dat");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Restart: 2 evaluations are taken from"));
  EXPECT_EQ(folder.read("basin_Sensitivities.dat"), expected);
}

TEST(LocalSensitivity, LeavesOutAParameterOfAFewChoicesUnlessAskedFor) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 1});
  folder.editSetup("Upper_Bound = 5.0\n      Transformation_Type = 0",
                   "Upper_Bound = 3.0\n      Transformation_Type = 2");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const std::string told =
      "Warning: Parameter b has no derivatives: an integer of 4 values, it is a choice rather than a quantity; "
      "Perturb_Choices = 1 in LOCAL_SA asks for its derivatives";
  EXPECT_THAT(folder.read("basin.log"),
              AllOf(HasSubstr("\nModel evaluations planned: 3\n"), HasSubstr(told),
                    HasSubstr("\nParameter b is left out of the covariance matrix: an integer of 4 values, it is ")));
  EXPECT_THAT(folder.read("basin_Sensitivity.dat"), HasSubstr("\n# " + told));
  if (folder.exists("basin_Report.html")) {
    EXPECT_THAT(folder.read("basin_Report.html"), HasSubstr(told.substr(told.find("Parameter"))));
  }
  EXPECT_EQ(readDataTable(folder.read("basin_Sensitivity.dat")).rows.size(), 3U);
  folder.editSetup("[/LOCAL_SA]", "  Perturb_Choices = 1\n    [/LOCAL_SA]");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  EXPECT_FALSE(std::isnan(cellOf(folder.read("basin_Sensitivities.dat"), {"b", "measure"}, "Derivative")));
}

TEST(LocalSensitivity, LeavesOutTheSecondOfTwoParametersThatActAsASumAtAnyStep) {
  const std::string inDouble = "(b[1] + b[2]) * exp(-x / 7)";
  const std::string inSingle = "single(single(b[1] + b[2]) * single(exp(-x / 7)))";
  for (const std::string& printed :
       {"sprintf(\"%.6f\", " + inDouble, "sprintf(\"%.7g\", " + inDouble, "sprintf(\"%.17g\", " + inDouble,
        "sprintf(\"%.8g\", " + inSingle, "sprintf(\"%.9g\", " + inSingle, "shortest(" + inSingle}) {
    CertifiedProblem problem{nullptr, "", {{"3.1", 0}, {"2.7", 0}}};
    const std::string formula = printed + ") + 0";
    problem.formula = formula.c_str();
    for (int i = 0; i < 40; ++i) problem.data += fmt::format("{} {} ", i, 5.8 * std::exp(-i / 7.0) + (i % 3 - 1) * 0.1);
    for (const char* fraction : {"1e-2", "1e-3", "1e-4"}) {
      const std::vector<double> deviations = deviationsOf(problem, fraction);
      EXPECT_GT(deviations[0], 0.0) << printed << " " << fraction;
      EXPECT_TRUE(std::isnan(deviations[1])) << printed << " " << fraction << " " << deviations[1];
    }
  }
}

TEST(LocalSensitivity, ItsWarningsAreCountedAndPassedOnLikeAllOthers) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 1});
  folder.editSetup("Lower_Bound = 0.0", "Lower_Bound = 4.0");  // no room for a central step
  const ProgramResult run = runProgram({setup});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const int warnings = occurrences(folder.read("basin.log"), "\nWarning: ");
  EXPECT_GT(warnings, 0);
  EXPECT_EQ(occurrences(folder.read("basin._spi_"), "\nMESSAGWarning: "), warnings);
  EXPECT_EQ(occurrences(folder.read("basin_Sensitivity_Run.dat"), "\nwarning\t"), warnings);
  EXPECT_THAT(run.error, HasSubstr(fmt::format("{} warning", warnings)));
  folder.editSetup("Weight = 1.0\n        Weight_Above = 1.0", "Weight = 0.0\n        Weight_Above = 0.0");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\nWarning: No covariance matrix: 0 observations count, as the "));
}

TEST(Uncertainty, SummaryAndBandAreThoseOfTheSample) {
  const ModelFolder folder;
  std::string observed = folder.read("observed.csv");
  const auto second = observed.find("2001-01-02,") + 11;
  observed.erase(second, observed.find('\n', second) - second);  // a missing value
  folder.write("observed.csv", observed);
  // a ~ N(5, 0.5), b ~ N(2, 0.1), 400 sets.
  const ProgramResult run =
      runProgram({folder.writeSetup({.option = 3, .maxEvaluations = 400, .modelArguments = "--fail-above 6.2"})});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const std::string results = folder.read("basin.dat");
  const std::string quantiles = folder.read("basin_Quantiles.dat");
  EXPECT_NEAR(cellOf(quantiles, {"parameter", "a"}, "Mean"), 5.0, 0.005);
  EXPECT_NEAR(cellOf(quantiles, {"parameter", "a"}, "StandardDeviation"), 0.5, 0.01);
  EXPECT_NEAR(cellOf(quantiles, {"parameter", "a"}, "5 %"), 5.0 - 1.645 * 0.5, 0.02);
  EXPECT_EQ(cellOf(quantiles, {"measure", "flow"}, "Count"), 397);
  EXPECT_THAT(results, HasSubstr("\n# Uncertainty analysis: 400 evaluations, 3 failed"));
  EXPECT_LT(std::abs(cellOf(folder.read("basin_SampleCorrelation.dat"), {"a"}, "b")), 0.15);

  std::istringstream band(folder.read("basin_Band_1.csv"));
  std::vector<std::string> lines;
  for (std::string line; std::getline(band, line);) lines.push_back(line);
  ASSERT_EQ(lines.size(), 2U + 364U);  // the missing observation is not there
  EXPECT_EQ(lines[0], "# Band of flow");
  EXPECT_EQ(lines[1], "time,observed,5 %,50 %,95 %");
  EXPECT_THAT(lines[3], StartsWith("2001-01-03 00:00,"));
  double values[4];
  ASSERT_EQ(
      std::sscanf(lines[2].c_str(), "2001-01-01 00:00,%lf,%lf,%lf,%lf", values, values + 1, values + 2, values + 3), 4);
  EXPECT_EQ(values[0], 5.0);
  // At t = 0 the model gives a: the band's median lies amid the values of the runs that succeeded.
  const auto below = std::ranges::count_if(readDataTable(results).rows, [&](const auto& row) {
    return row[1] == "OK" && std::strtod(row[2].c_str(), nullptr) < values[2];
  });
  EXPECT_EQ(below, 198);  // of 397; in single precision the median itself may count
  EXPECT_THAT(results,
              HasSubstr("\n# Band of flow: 100.0 % of 364 observations lie between the 5 and the 95 % quantile\n"));
  EXPECT_THAT(folder.read("basin.log"), AllOf(HasSubstr("\nBand of flow: 100.0 % of 364"),
                                              HasSubstr("\n400 model evaluations, 3 of them failed\n")));
}

TEST(Uncertainty, ABandOfStepsGoesThroughGapsAndBehindThePeriodAndARestartNeedsTheSameSteps) {
  const ModelFolder folder;
  const std::string observed = folder.read("observed.csv");
  const auto lineOf = [&](const char* day) { return observed.find(day); };
  folder.write("observed.csv", observed.substr(0, lineOf("2001-02-01")) + "2001-02-03 12:00,5.9\n" +
                                   observed.substr(lineOf("2001-03-01")));
  folder.write("model/simulated.csv", observed);
  const std::string setup = folder.writeSetup({.option = 3, .restart = 1});
  folder.editSetup("End_Date = 2001-12-31", "End_Date = 2001-11-30");
  folder.editSetup("\n    Sample_Size", "\n    Band_Times = 'steps'\n    Band_End_Date = 2001-12-31\n    Sample_Size");
  ASSERT_EQ(runProgram({setup}).exitCode, 0) << folder.read("basin.log");
  const std::string band = folder.read("basin_Band_1.csv");
  EXPECT_EQ(occurrences(band, "\n2001-"), 366);
  EXPECT_EQ(occurrences(band, " 00:00,,"), 28 + 31);
  EXPECT_EQ(occurrences(band, ",40\n"), 366);
  EXPECT_THAT(band, AllOf(HasSubstr("\n2001-02-03 12:00,5.9,"), HasSubstr("\n2001-12-31 00:00,,")));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("% of 307 observations lie between"));
  folder.write("model/simulated.csv", observed.substr(0, lineOf("2001-12-31")));
  EXPECT_THAT(runProgram({setup}).error, HasSubstr("Error: Unable to continue the earlier run"));
  EXPECT_EQ(folder.read("basin_Band_1.csv"), band) << "refused without a change";
  folder.write("model/simulated.csv", observed);
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  EXPECT_EQ(folder.read("basin_Band_1.csv"), band);
}

TEST(Uncertainty, TheLogTellsTheDistributionOfEachParameterAndWarnsOfWhatIsHardlyMeant) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 3});
  folder.editSetup("Lower_Bound = 0.0\n      Upper_Bound = 10.0\n      Transformation_Type = 0",
                   "Lower_Bound = 4.0\n      Upper_Bound = 6.0\n      Transformation_Type = 1");
  folder.editSetup("Upper_Bound = 5.0\n      Transformation_Type = 0",
                   "Upper_Bound = 2.0\n      Transformation_Type = 2");
  folder.editSetup("Standard_Deviation = 0.1\n    [/PARAMETER_2]",
                   "Standard_Deviation = 1.25\n    [/PARAMETER_2]\n    [PARAMETER_3]\n    [/PARAMETER_3]");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const std::string log = folder.read("basin.log");
  EXPECT_THAT(
      log, HasSubstr("\n  PARAMETER_1: a, mean 5, standard deviation 0.5 of the natural logarithm; on the model "
                     "scale median 148.413, 5 to 95 % from 65.2074 to 337.791\n"
                     "  PARAMETER_2: b, mean 2, standard deviation 1.25; on the model scale 5 to 95 % from 0 to "
                     "4\n    an integer: values drawn from 2 to below 3 become 2, so that half of the values are "
                     "below 2; the mean to give for values around 2 is 2.5; values below the lower bound are truncated "
                     "upwards, towards it: those from above -1 to below 1 all become 0\n"));
  EXPECT_THAT(log, HasSubstr("Warning: Mean_Value of PARAMETER_1 (a) is 5, on the model scale 148.413: outside the "
                             "bounds 4 to 6; the mean of a logarithmic parameter is that of its natural logarithm, "
                             "ln(5) = 1.60944\n"));
  EXPECT_THAT(log, Not(HasSubstr("Mean_Value of PARAMETER_2")));
  EXPECT_THAT(log, HasSubstr("PARAMETER_3: not read: PARAMETER_n is the distribution of the n-th of the 2 variable "));
  if (folder.exists("basin_Report.html")) {  // not in a build without its page
    EXPECT_THAT(folder.read("basin_Report.html"),
                HasSubstr(R"("problems":["40 runs with a value are too few, at least 100")"));
  }

  folder.editSetup("Mean_Value = 5.0", "Mean_Value = 1.6");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.dat"), HasSubstr("\n# Sets outside the bounds of a parameter: "));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\nSets outside the bounds of a parameter: "));
}

/// What an analysis that did not come to its end says it is of.
void expectMarked(const ModelFolder& folder, const std::string& results, const std::vector<std::string>& tables,
                  const std::string& ofHowMany) {
  const std::string mark = "Unfinished run: statistics of " + ofHowMany + " evaluations\n";
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\n" + mark));
  EXPECT_THAT(folder.read(results), HasSubstr("\n# " + mark));
  for (const std::string& table : tables) EXPECT_THAT("\n" + folder.read(table), HasSubstr("\n# " + mark)) << table;
  if (folder.exists("basin_Report.html")) {  // not in a build without its page
    EXPECT_THAT(folder.read("basin_Report.html"),
                HasSubstr("The statistics are those of an unfinished run: of " + ofHowMany + " evaluations."));
  }
}

TEST(UnfinishedAnalysis, AnUncertaintyAnalysisHasTheStatisticsOfWhatSucceededUntilItGoesOn) {
  const ModelFolder folder;
  folder.useScript("test -e '" + folder / "sound" + "' || set -- --fail-above 5.3");
  const std::vector<std::string> files = {"basin_Quantiles.dat", "basin_SampleCorrelation.dat", "basin_Band_1.csv"};
  const std::string setup = folder.writeSetup({.option = 3, .restart = 2});
  EXPECT_EQ(runProgram({setup}).exitCode, 1);
  const auto rows = readDataTable(folder.read("basin.dat")).rows;
  const std::size_t count = rows.size() - 5;  // a tenth of 40 may fail
  expectMarked(folder, "basin.dat", files, fmt::format("{} of 40", count));
  const std::string quantiles = folder.read(files[0]);
  EXPECT_EQ(cellOf(quantiles, {"measure", "flow"}, "Count"), count);
  EXPECT_EQ(cellOf(quantiles, {"parameter", "a"}, "Count"), rows.size());
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("failed evaluations are described in calSimErr.dat\n"));
  EXPECT_THAT(folder.read("basin_Run.dat"), HasSubstr(fmt::format("\nanalysedEvaluations\t{}\n", count)));

  folder.write("sound", "");
  const ProgramResult goneOn = runProgram({setup});
  EXPECT_EQ(goneOn.exitCode, 0) << goneOn.error;
  EXPECT_EQ(cellOf(folder.read(files[0]), {"measure", "flow"}, "Count"), 36) << "four failures came before a success";
  for (const std::string& file : files) EXPECT_THAT(folder.read(file), Not(HasSubstr("Unfinished"))) << file;
  EXPECT_FALSE(folder.exists("basin_Quantiles.1.dat"));
  EXPECT_FALSE(folder.exists("basin_Band_1.1.csv"));
}

TEST(UnfinishedAnalysis, ASensitivityAnalysisHasTheDerivativesThatItKnows) {
  const ModelFolder folder;
  folder.useScript("grep -q '^b = *1$' parameters.txt || exit 3");  // the fourth of five sets
  EXPECT_EQ(runProgram({folder.writeSetup({.option = 1})}).exitCode, 1);
  expectMarked(folder, "basin_Sensitivity.dat", {"basin_Sensitivities.dat", "basin_ParameterLimits.dat"}, "3 of 5");
  const std::string table = folder.read("basin_Sensitivities.dat");
  EXPECT_NEAR(cellOf(table, {"a", "measure", "flow"}, "Derivative"), -0.816676, 1e-5);
  EXPECT_TRUE(std::isnan(cellOf(table, {"b", "measure", "flow"}, "Derivative")));
  folder.write("basin_Band_1.csv", "# Band of an uncertainty analysis\n");
  EXPECT_EQ(runProgram({folder.writeSetup({.option = 1, .restart = 1})}).exitCode, 1);
  EXPECT_TRUE(folder.exists("basin_Band_1.csv")) << "it is not this task's";
}

TEST(UnfinishedAnalysis, OneThatIsCancelledHasStatisticsAndItsLogStillEndsWithTheReason) {
  const ModelFolder folder;
  folder.useScript("sleep 0.1");
  RunningProgram program({folder.writeSetup({.option = 3})});
  EXPECT_TRUE(folder.reaches("basin.log", "No. 3 completed: OK"));
  folder.write("basin._kill_", "");
  EXPECT_EQ(program.wait().exitCode, 1);
  const auto count = readDataTable(folder.read("basin.dat")).rows.size();
  expectMarked(folder, "basin.dat", {"basin_Quantiles.dat", "basin_Band_1.csv"}, fmt::format("{} of 40", count));
  EXPECT_THAT(folder.read("basin.log"), EndsWith("\n\nSimulation cancelled\n"));
}

}  // namespace
}  // namespace mirevo::testing

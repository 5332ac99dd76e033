#include "measures/series_tables.h"

#include <filesystem>
#include <tuple>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/reading_watch.h"
#include "matchers.h"
#include "measures/listing_series.h"
#include "measures/statistics.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

const EvaluationPeriod kPeriod{{2001, 1, 1}, {2001, 12, 31}};

class SeriesTablesTest : public ::testing::Test {
 protected:
  SeriesTablesTest() {
    folder_.write("obs.csv", "time,Q,H\n2001-01-01,1,2\n");
    folder_.write("sim.csv", "time,Q,H\n2001-01-01,3,4\n");
  }

  OutputMeasure measure(const std::string& simulation, const std::string& observation, int simulationItem = 1) const {
    return {.simulation = {folder_ / simulation, simulationItem}, .observation = {folder_ / observation, 1}};
  }

  TemporaryFolder folder_;
};

TEST_F(SeriesTablesTest, MeasuresShareTheFilesTheyNameAlike) {
  folder_.write("sim2.csv", "time,hour,Q\n2001-01-01,9,1\n");
  const OutputMeasure fromFile{.interfaceType = InterfaceType::measureFile, .simulation = {folder_ / "not there", 1}};
  const std::vector<OutputMeasure> measures{measure("sim2.csv", "obs.csv"), fromFile, measure("sim.csv", "obs.csv  "),
                                            measure("sim2.csv  ", "obs.csv")};
  SeriesTables tables = SeriesTables::MirevoTSobjectInit(measures, kPeriod);
  EXPECT_THAT(tables.observationFileNames(), ElementsAre((folder_ / "obs.csv")));
  EXPECT_THAT(tables.simulationFileNames(), ElementsAre((folder_ / "sim2.csv"), (folder_ / "sim.csv")));
  EXPECT_THAT(tables.warnings(), ElementsAre(HasSubstr("sim2.csv: column 2 is called \"hour\" and is read as item")));
  EXPECT_EQ(&tables.observation(0), &tables.observation(2));
  EXPECT_EQ(tables.tryOpenSimulationFiles(tables.simulationFileNames()), std::nullopt);
  EXPECT_EQ(&tables.simulation(0), &tables.simulation(3));
  EXPECT_EQ(tables.simulation(2).itemCount(), 2);
}

TEST_F(SeriesTablesTest, AListingIsReadAsItsMeasuresSay) {
  folder_.write("sim.lst", "5.5 6\n");
  ListingFault fault;
  const auto formOf = [&](const std::string& instructions) {
    const ListingSettings settings{.instructionFile = "i.ins", .start = DateRecord{2001, 1, 1}, .stepHours = 24.0};
    return ListingForm::make(settings, "pif ~\n" + instructions, "", fault);
  };
  std::vector<OutputMeasure> measures(3, measure("sim.lst", "obs.csv"));
  measures[0].simulation.listing = measures[2].simulation.listing = formOf("l1 [q_1]1:3 !h_1!\n");
  measures[2].simulation.itemNo = 2;
  measures[1].simulation.listing = formOf("l1 !dum! !q_1!\n");
  SeriesTables tables = SeriesTables::MirevoTSobjectInit(measures, kPeriod);
  EXPECT_THAT(tables.simulationFileNames(), ElementsAre(folder_ / "sim.lst", folder_ / "sim.lst"));
  EXPECT_EQ(tables.comparedItems(2).simulated, "item No. 2 (h)");
  EXPECT_EQ(tables.tryOpenSimulationFiles(tables.simulationFileNames()), std::nullopt);
  EXPECT_EQ(&tables.simulation(0), &tables.simulation(2));
  EXPECT_THAT(tables.simulation(0).values(1), ElementsAre(5.5F));
  EXPECT_THAT(tables.simulation(1).values(1), ElementsAre(6.0F));
  EXPECT_THAT(tables.takeDoubts(), ElementsAre());
  // A run may write a longer number.
  folder_.write("sim.lst", "15.5 6\n");
  for (const std::size_t count : {1U, 0U}) {
    EXPECT_EQ(tables.tryOpenSimulationFiles(tables.simulationFileNames()), std::nullopt);
    EXPECT_EQ(tables.takeDoubts().size(), count);
  }
  folder_.write("sim.lst", "15.5 x\n");
  EXPECT_THAT(tables.tryOpenSimulationFiles(tables.simulationFileNames()).value_or(""),
              HasSubstr("sim.lst:1:6: expected a number, found \"x\" (the number \"q_1\" at i.ins:2:10)"));
  EXPECT_THAT(refusalOf([&] { SeriesTables::MirevoTSobjectInit(measures, kPeriod); }),
              StartsWith("Error opening TS object for file: "));
}

TEST_F(SeriesTablesTest, ObservationsThatMayBeMarkersOfMissingOnesAreWarnedOf) {
  folder_.write("marked.csv", "time,Q\n2001-01-01,-99.99\n2001-01-02,3\n2001-01-03,-99.99\n");
  folder_.write("cold.csv", "time,T\n2001-01-01,-99\n2001-01-02,-120\n");
  const std::vector<OutputMeasure> measures{measure("sim.csv", "marked.csv"), measure("sim.csv", "marked.csv"),
                                            measure("sim.csv", "cold.csv")};
  EXPECT_THAT(SeriesTables::MirevoTSobjectInit(measures, kPeriod).warnings(),
              ElementsAre(HasSubstr("marked.csv: item No. 1 (Q) is -99.99 at 2 of 3 times in the evaluation period")));
}

TEST_F(SeriesTablesTest, AnItemThatTheSetupDoesNotNameIsWarnedOfInAFileWithSeveral) {
  folder_.write("rain.csv", "time,P,Q\n2001-01-01,9,1\n");
  OutputMeasure unnamed = measure("rain.csv", "obs.csv");
  unnamed.simulation.isDefaultItem = true;
  EXPECT_THAT(
      SeriesTables::MirevoTSobjectInit(std::vector{unnamed, measure("rain.csv", "obs.csv")}, kPeriod).warnings(),
      ElementsAre(HasSubstr("rain.csv has several items, and item No. 1 (P) is compared, as the section has no "
                            "Item_No:\n1: P\n2: Q")));
}

TEST_F(SeriesTablesTest, ObservationsOfWhichACriterionIsUndefinedEndTheRunBeforeItBegins) {
  folder_.write("flat.csv", "time,Q\n2001-01-01,2\n2001-01-02,2\n");
  OutputMeasure nse = measure("sim.csv", "flat.csv");
  nse.name = "Flow";
  nse.statisticType = findStatistic("NSE").value();
  EXPECT_THAT(refusalOf([&] { SeriesTables::MirevoTSobjectInit(std::vector{nse}, kPeriod); }),
              HasSubstr("cannot be computed, whatever the model does, as it is if the observed values do not vary"));
  for (const char* name : {"mean absolute error", "index of agreement"}) {
    nse.statisticType = findStatistic(name).value();
    EXPECT_THAT(SeriesTables::MirevoTSobjectInit(std::vector{nse}, kPeriod).warnings(), ElementsAre());
  }
  // A run need not compare them all.
  folder_.write("flat.csv", "time,Q\n2001-01-01,2\n2001-01-02,-3\n");
  nse.statisticType = findStatistic("log-NSE").value();
  EXPECT_THAT(SeriesTables::MirevoTSobjectInit(std::vector{nse}, kPeriod).warnings(),
              ElementsAre(HasSubstr("cannot be computed where all of its observations are compared")));
}

TEST_F(SeriesTablesTest, WeightsThatCannotBeMeantEndTheRunOrAreWarnedOf) {
  folder_.write("weighed.csv",
                "# missing = -9\ntime,Q,E,C\n2000-12-31,4,0,7\n2001-01-01,4,2,1\n2001-01-02,-9,0,2\n"
                "2001-01-03,6,-1,3\n2001-01-04,6,-9,4\n");
  const std::tuple<ObservationWeighting, std::string, std::string> cases[] = {
      {{.errorItem = 2},
       "Error: Invalid weight of an observation for output measure Flow",
       "s.kdx:7:9: Error_Item_No: " + folder_ / "weighed.csv" + ": item No. 2 (E) is -1 at 2001-01-03 00:00, where"},
      {{.errorItem = 2, .qualityItem = 3, .leftOut = {3}},
       "Error: Invalid weight",
       "(E) is missing at 2001-01-04 00:00"},
      {{.weightItem = 2}, "Error: Invalid weight", "expected a weight from 1e-12 to 1e12, or 0"},
      {{.weightItem = 4}, "Error: Item No. 4 not found in " + folder_ / "weighed.csv", "the file has 3 items"},
      {{.qualityItem = 3, .leftOut = {1, 3, 4}},
       "Error: No observation counts for output measure Flow",
       "leave in the evaluation period has a code of Quality_Left_Out (1, 3, 4)"},
      {{.qualityItem = 3, .leftOut = {2, 7}},
       "",
       "has a code of Quality_Left_Out (2, 7); there are 1 (1 time), 3 (1 time), 4 (1 time)"},
      {{.errorItem = 2, .qualityItem = 3, .leftOut = {3, 4}}, "", ""},
  };
  for (const auto& [weighting, message, detail] : cases) {
    OutputMeasure flow = measure("sim.csv", "weighed.csv");
    flow.name = "Flow";
    flow.weighting = weighting;
    flow.weighting.weightLocation = "s.kdx:7:9: Error_Item_No: ";
    std::vector<std::string> warnings;
    const std::string refusal =
        refusalOf([&] { warnings = SeriesTables::MirevoTSobjectInit(std::vector{flow}, kPeriod).warnings(); });
    EXPECT_THAT(refusal, StartsWith(message.empty() ? "accepted" : message));
    if (detail.empty()) {
      EXPECT_THAT(warnings, ElementsAre());
    } else {
      EXPECT_THAT(message.empty() ? warnings.at(0) : refusal, HasSubstr(detail));
    }
  }
  OutputMeasure flow = measure("sim.csv", "weighed.csv");
  flow.weighting.errorItem = 2;
  flow.selection.highestObserved = 5;
  EXPECT_THAT(refusalOf([&] { SeriesTables::MirevoTSobjectInit(std::vector{flow}, kPeriod); }), StartsWith("accepted"));
}

TEST_F(SeriesTablesTest, ASelectionThatLeavesNoObservationEndsTheRunBeforeItBegins) {
  folder_.write("days.csv", "time,Q\n2001-01-01,2\n2001-01-02,3\n2001-02-01,4\n2001-02-01 12:00,5\n");
  OutputMeasure selected = measure("sim.csv", "days.csv");
  selected.name = "Flow";
  selected.selection = {.months = {2, 3}, .lowestObserved = 5, .location = "s.kdx:9:3: Months: "};
  EvaluationPeriod period = kPeriod;
  period.warmUpDays = 1;
  const auto warnings = [&] { return SeriesTables::MirevoTSobjectInit(std::vector{selected}, period).warnings(); };
  EXPECT_THAT(warnings(), ElementsAre("s.kdx:9:3: Months: few observations count for output measure \"Flow\": " +
                                      folder_ / "days.csv" +
                                      ": 4 observations in the evaluation period, 3 of them left by Warm_Up_Days = 1, "
                                      "2 of them left by Months = 2, 3, 1 of them left by Lowest_Observed = 5"));
  selected.selection.lowestObserved = 5.5;
  EXPECT_THAT(refusalOf(warnings), StartsWith("Error: No observation counts for output measure Flow\ns.kdx:9:3: "));
  selected.selection = {};
  selected.timeMatch.kind = TimeMatch::mean;
  EXPECT_THAT(warnings(), Contains(HasSubstr("several observations on one day, the first on 2001-02-01 00:00")));
}

TEST_F(SeriesTablesTest, SetupFailuresEndTheRun) {
  folder_.write("bad.csv", "time,Q\n2001-01-01,1,2\n");
  folder_.write("text.csv", "time,Q\n2001-01-01,bad\n");
  folder_.write("none.csv", "time,Q\n");
  folder_.write("empty.csv", "time,Q\n2000-12-31,4\n2001-01-01,\n");
  OutputMeasure located = measure("sim.csv", "gone.csv");
  located.observation.fileLocation = "s.kdx:7:9: File_Name: ";
  OutputMeasure withItem = measure("sim.csv", "obs.csv", 3);
  withItem.simulation.itemLocation = "s.kdx:8:9: Item_No: ";
  OutputMeasure unwritten = measure("gone.csv", "obs.csv");
  unwritten.simulation.isOfModel = true;
  const std::tuple<OutputMeasure, std::string, std::string> cases[] = {
      {unwritten, "Error opening TS object for file: " + folder_ / "gone.csv",
       ": No such file or directory\nThe model writes it: run the model once in its own folder"},
      {withItem, "Error: Item No. 3 not found in " + folder_ / "sim.csv", "\ns.kdx:8:9: Item_No: the file has 2 items"},
      {measure("gone.csv", "obs.csv"), "Error opening TS object for file: " + folder_ / "gone.csv",
       folder_ / "gone.csv" + ": No such file or directory"},
      {measure("sim.csv", "gone.csv "), "Error opening TS object for file: " + folder_ / "gone.csv", "No such file"},
      {measure("sim.dat", "obs.csv"), "Error creating TS object for file: " + folder_ / "sim.dat", ".csv"},
      {measure("sim.csv", "bad.csv"), "Error opening TS object for file: " + folder_ / "bad.csv", "bad.csv:2:1:"},
      {measure("sim.csv", "obs.csv", 3), "Error: Item No. 3 not found in " + folder_ / "sim.csv",
       "the file has 2 items\n1: Q\n2: H"},
      {located, "Error opening TS object for file: " + folder_ / "gone.csv",
       "\ns.kdx:7:9: File_Name: " + folder_ / "gone.csv" + ": No such file"},
      {measure("sim.csv", "none.csv"), "Error getting time properties of TS object of file " + folder_ / "none.csv",
       "the file has no time step"},
      {measure("sim.csv", "empty.csv"),
       "Error: No simulated data found at observation times for item No. 1 in " + folder_ / "sim.csv",
       "nothing to compare with: item No. 1 (Q) of the observed " + folder_ / "empty.csv" + " has no value in the"},
      {measure("sim.csv", "text.csv"), "Error getting data of TS item in " + folder_ / "text.csv", "text.csv:2:12:"},
  };
  for (const auto& [measure, message, detail] : cases) {
    EXPECT_THAT(refusalOf([&] { SeriesTables::MirevoTSobjectInit(std::vector{measure}, kPeriod); }),
                AllOf(StartsWith(message + "\n"), HasSubstr(detail)));
  }
}

TEST_F(SeriesTablesTest, UnusableResultsOfARunAreAReasonAndNoError) {
  SeriesTables tables = SeriesTables::MirevoTSobjectInit(std::vector{measure("sim.csv", "obs.csv", 2)}, kPeriod);
  // expected: the reason why it is of no use; empty: it is
  const std::pair<const char*, std::string> cases[] = {
      {"time,Q,H\n2001-01-01,,5\n", ""},
      {"time,Q,H\n2001-01-01,A:e,5\n", ""},  // a column that no measure reads
      {"time,Q,H\n", ": expected at least one time step, found none"},
      {"", ":1:1: expected a header row"},
      {"time,Q,H\n2001-01-01,1,\n2001-01-02,1,NaN\n", ": item No. 2 (H) has missing values only"},
      {"# missing = 7\ntime,Q,H\n2001-01-01,1,7\n", ": item No. 2 (H) has missing values only"},
      {"time,Q,H\n2001-01-01,1,****\n", ":2:14: expected a number"},
      {"time,Q,H\n2001-01-01,1,2\n2001-01", ":3:1: expected a valid time"},
      {"time,Q,H\n2001-01-01,1,6\n", ""},
  };
  for (const auto& [content, expected] : cases) {
    folder_.write("slot.csv", content);
    const auto reason = tables.tryOpenSimulationFiles(std::vector{(folder_ / "slot.csv")});
    ASSERT_EQ(reason.has_value(), !expected.empty()) << content << reason.value_or("");
    if (reason) {
      EXPECT_THAT(*reason, HasSubstr((folder_ / "slot.csv") + expected));
      EXPECT_EQ(reason->find('\n'), std::string::npos);
    } else {
      EXPECT_EQ(tables.simulation(0).timeStepCount(), 1);
    }
  }
  tables.releaseSimulationFiles();
  EXPECT_THAT(tables.tryOpenSimulationFiles(std::vector{(folder_ / "gone.csv")}).value(), HasSubstr("No such file"));

  const std::vector slot{folder_ / "slot.csv"};
  tables.watch().begin(-1.0, "a moment");
  EXPECT_EQ(tables.tryOpenSimulationFiles(slot), folder_ / "slot.csv" + ": reading it took longer than a moment");
  tables.watch().end();
  EXPECT_EQ(tables.tryOpenSimulationFiles(slot), std::nullopt);
  std::filesystem::resize_file(folder_ / "slot.csv", 40'000'000'000);
  EXPECT_EQ(tables.tryOpenSimulationFiles(slot),
            folder_ / "slot.csv" +
                ": its 40000.0 MB are too many: more than 4000.0 MB, and more than 100 times the 24 "
                "bytes of the file in the model's folder");
}

}  // namespace
}  // namespace mirevo

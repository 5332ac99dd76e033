#include "import/pest_case.h"

#include <filesystem>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "import/import_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class PestCase : public ImportTest {};

TEST_F(PestCase, ParametersKeepTheirScaleTiesAndBounds) {
  const ImportedCase made = importPest(kPestCase);
  const auto of = [&made](const char* name) {
    const ModelParameter* const found = made.parameter(name);
    EXPECT_NE(found, nullptr) << name;
    return found == nullptr ? ModelParameter() : *found;
  };
  EXPECT_EQ(of("k1").transformationType, TransformationType::logarithmic);
  EXPECT_EQ(of("k1").lowerBound, 0.01);
  EXPECT_EQ(of("k3").equation, "[k2] * 2");
  EXPECT_EQ(of("k3").upperBound, 4.0) << "widened to the value";
  EXPECT_EQ(of("k4").parameterType, ParameterType::fixed);
  EXPECT_EQ(of("k5_unscaled").parameterType, ParameterType::variable);
  EXPECT_EQ(of("k5_unscaled").upperBound, 2.0);
  EXPECT_EQ(of("k5").equation, "[k5_unscaled] * 10 + (5)");
  EXPECT_EQ(of("k5").upperBound, 25.0);
  EXPECT_EQ(of("pi1").equation, "(1) * log10([K1])");
}

TEST_F(PestCase, ObservationsAreMeasuresWithTheirWeightsInTheObjectiveFunctionOfTheirGroup) {
  const ImportedCase made = importPest(kPestCase);
  using Row = std::tuple<std::string, double, double, double, std::string>;
  std::vector<Row> rows;
  for (const ImportedMeasure& one : made.measures) {
    rows.emplace_back(one.name, one.observedValue.value(), one.weight, one.weightAbove, one.objective);
  }
  EXPECT_THAT(rows,
              ElementsAre(Row{"h1", 3, 1, 1, "head"}, Row{"h2", 12, 2, 2, "head"}, Row{"h3", 20, 0, 0.5, "less_flow"},
                          Row{"h4", 99, 1, 1, ""}, Row{"pi1", 0.477, 0.5, 0.5, "regul_1"}));
  EXPECT_EQ(made.objectives.size(), 3U);
  EXPECT_EQ(made.task.seed, 11);
  EXPECT_EQ(made.task.longestModelRun, 120.0);
  EXPECT_EQ(made.task.differencing, "central");
  EXPECT_EQ(made.task.perturbedPartOfValue, 0.02);
}

/// Every line of the source that has content is either in the setup as it is, or in the account.
TEST_F(PestCase, NothingIsLeftOutInSilence) {
  const std::string account = importPest(kPestCase).notes.text();
  for (const char* expected :
       {"case.pst:9: the search by derivatives has no counterpart",
        "case.pst:9: covariance and limits of the parameters: Calculate_Covmatrix takes time series alone",
        "case.pst:3: control data: rstfle = restart",
        "case.pst:5: control data: precis = single",
        "case.pst:6: control data: rlambda1 = 10.0",
        "case.pst:9: control data: nphinored = 4",
        "case.pst:10: control data: ieig = 1",
        "case.pst:11: section \"* singular value decomposition\": all of it",
        "case.pst:13: section \"* singular value decomposition\": 4 5e-7",
        "case.pst:16: parameter group k:",
        "case.pst:18-22: PARCHGLIM = factor",
        "case.pst:20: the bounds of k3",
        "case.pst:22: SCALE = 10, OFFSET = 5",
        "case.pst:23: a tied parameter",
        "case.pst:31: as in PEST++, the group less_flow has upper bounds",
        "case.pst:32: a weight of 0",
        "case.pst:36: in.dat did not exist and is made",
        "case.pst:39: prior information",
        "case.pst:39: the weight of a regularisation group",
        "case.pst:40: ++n_iter_super(3)"}) {
    EXPECT_THAT(account, HasSubstr(expected));
  }
  EXPECT_THAT(account, Not(HasSubstr("rand_seed")));
  EXPECT_THAT(importPest(edited(kPestCase, {{"estimation", "regularisation"}})).notes.text(),
              HasSubstr("case.pst:3: PESTMODE = regularisation has no counterpart"));
  EXPECT_THAT(importPest(edited(kPestCase, {{"sh model.sh", "model.bat"}})).notes.text(),
              HasSubstr("case.pst:34: the command \"model.bat\" is one of Windows"));
  folder_.write("src/out.dat", "the heads\n1 x\n");
  EXPECT_THAT(importPest(kPestCase).notes.text(),
              HasSubstr("case.pst:37: out.ins does not read the out.dat that is here: out.dat:2:3: expected a number"));
}

TEST_F(PestCase, RefusesWhatItCannotTranslateWithItsPlace) {
  const std::tuple<Edits, const char*> cases[] = {
      {{{"K1 log factor 1.0", "K1 log factor x"}}, "case.pst:18: expected a number for PARVAL1, found \"x\""},
      {{{"K1 log factor 1.0", "K1 log factor 1000"}}, "case.pst:18: expected PARVAL1 of K1 from PARLBND to PARUBND"},
      {{{"K1 log factor 1.0 0.01", "K1 log factor 1.0 0"}}, "case.pst:18: expected a PARLBND above 0"},
      {{{"K1 log", "K1 cube"}}, "case.pst:18: expected none, log, fixed or tied for PARTRANS, found \"cube\""},
      {{{"K1 log factor 1.0 0.01 100 k 1.0 0.0 1", "K1 log factor 1.0 0.01"}}, "case.pst:18: expected PARUBND"},
      {{{"k2 none factor 2.0 0.0 10.0", "k2 none factor 2.0 10.0 0.0"}}, "case.pst:19: expected PARLBND of at most"},
      {{{"k2 none", "k1 none"}}, "case.pst:19: the parameter \"k1\" is there twice"},
      {{{"k3 k2", "k3 k9"}}, "case.pst:23: expected the name of a parameter, found \"k9\", did you mean"},
      {{{"k3 k2\n", ""}}, "case.pst:20: expected what k3 is tied to"},
      {{{"k3 k2", "k2 k4"}}, "case.pst:23: expected PARTRANS = tied of k2"},
      {{{"h2 12.0", "h1 12.0"}}, "case.pst:30: the observation \"h1\" is there twice"},
      {{{"h2 12.0 2.0", "h2 12.0 -2"}}, "case.pst:30: expected a weight of 0 or more, found -2"},
      {{{"h2 12.0", "h9 12.0"}}, "case.pst:30: expected an instruction that reads h9, found none"},
      {{{"out.ins out.dat", "out.ins ../out.dat"}},
       "case.pst:37: expected a file in the folder of case.pst or below it"},
      {{{"out.ins out.dat", "none.ins out.dat"}}, "case.pst:37: \"none.ins\": No such file"},
      {{{"sh model.sh\n", ""}}, "expected a model command line, found none"},
      {{{"log(k1)", "log(k7)"}}, "case.pst:39: expected the name of a parameter, found \"k7\""},
      {{{"10 0.005 4", "ten 0.005 4"}}, "case.pst:9: expected an integer for NOPTMAX, found \"ten\""},
  };
  for (const auto& [edits, expected] : cases) EXPECT_THAT(refusalOfPest(edits), HasSubstr(expected));
  folder_.write("src/q.tpl", "ptf ~\n~q~\n");
  EXPECT_THAT(refusalOfPest({{"in.tpl in.dat", "q.tpl in.dat"}}), HasSubstr("q.tpl:2:1: no parameter has the name"));
}

TEST_F(PestCase, TheFolderIsMadeWholeOrNotAtAll) {
  ImportedCase made = importPest(kPestCase);
  folder_.write("src/sub/data.txt", "1\n");
  std::filesystem::create_symlink("sub/data.txt", folder_ / "src/inside");
  std::filesystem::create_symlink("../elsewhere", folder_ / "src/outside");
  writeCaseFolder(made, folder_ / "src/made");
  EXPECT_EQ(folder_.read("src/made/model/sub/data.txt"), "1\n");
  EXPECT_EQ(std::filesystem::read_symlink(folder_ / "src/made/model/inside"), "sub/data.txt");
  EXPECT_EQ(std::filesystem::read_symlink(folder_ / "src/made/model/outside"), folder_ / "elsewhere");
  EXPECT_EQ(
      folder_.read("src/made/model/mirevo_run.sh"),
      "#!/bin/sh\n# Runs the model as case.pst has it.\nset -e\nsh model.sh\ncp mirevo_prior.in mirevo_prior.out\n");
  EXPECT_EQ(folder_.read("src/made/model/in.tpl"), folder_.read("src/in.tpl"));
  EXPECT_FALSE(folder_.exists("src/made/model/made"));
  EXPECT_THAT(folder_.read("src/made/case_import.txt"), HasSubstr(made.notes.text()));

  EXPECT_THAT(refusalOf([&] { writeCaseFolder(made, folder_ / "src/made"); }), HasSubstr("it exists"));
  folder_.write("src/mirevo_run.sh", "");
  EXPECT_THAT(refusalOf([&] { writeCaseFolder(made, folder_ / "other"); }),
              HasSubstr("the model has a file of this name"));
  EXPECT_THAT(refusalOf([&] { writeCaseFolder(made, folder_ / "no/such/folder"); }), HasSubstr("No such file"));
  for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
    EXPECT_EQ(entry.path().filename(), "src") << "what was begun is gone";
  }
}

}  // namespace
}  // namespace mirevo::testing

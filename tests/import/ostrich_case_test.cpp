#include "import/ostrich_case.h"

#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "import/import_folder.h"
#include "import/ostrich_input.h"
#include "import/ostrich_outputs.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class OstrichCase : public ImportTest {
 protected:
  /// What the instructions of a case read from a listing, "name=value ..." of each file.
  std::string readFrom(const std::string& listing, const Edits& edits) {
    folder_.write("src/out.dat", listing);
    const std::string notes = importOstrich(edited(kOstrichCase, edits)).notes.text();
    std::string found;
    for (std::size_t at = notes.find("that is here: "); at != std::string::npos;
         at = notes.find("that is here: ", at)) {
      at += std::string("that is here: ").size();
      found += notes.substr(at, notes.find('\n', at) - at) + "; ";
    }
    return found;
  }
};

TEST_F(OstrichCase, ParametersHaveTheValuesAndScalesThatWereMeant) {
  const ImportedCase made = importOstrich(kOstrichCase);
  const ModelParameter& a = *made.parameter("p_a");
  EXPECT_EQ(a.transformationType, TransformationType::logarithmic);
  EXPECT_EQ(a.upperBound, 100.0);
  const ModelParameter& c = *made.parameter("p_c");
  EXPECT_EQ(std::tuple(c.initialValue, c.lowerBound, c.upperBound), std::tuple(1.0, 0.1, 10.0)) << "given as log10";
  EXPECT_EQ(made.parameter("p_n")->transformationType, TransformationType::integer);
  EXPECT_EQ(made.parameter("p_t")->equation, "(2) * [p_b] + (1)");
  EXPECT_EQ(std::tuple(made.task.algorithm, made.task.evaluations, made.task.perturbation, made.task.seed),
            std::tuple("DDS", 60, 0.25, 77));
  EXPECT_THAT(made.newFiles.at("mirevo_1.tpl"), StartsWith("ptf ~\na ~p_a          ~\nb ~p_b          ~\n"));

  const ImportedCase random = importOstrich(edited(kOstrichCase, {{"p_b   2 ", "p_b random "}}));
  EXPECT_FALSE(random.task.includesInitial);
  EXPECT_THAT(random.notes.text(), HasSubstr("ostIn.txt:16: the initial value random: 5, the middle of the range"));
  const ImportedCase written = importOstrich(edited(kOstrichCase, {{"none log10 none", "none log10 log10"}}));
  EXPECT_EQ(written.parameter("p_a")->equation, "log10([p_a_value])");
}

TEST_F(OstrichCase, TiedParametersAreEquations) {
  const std::tuple<const char*, const char*> cases[] = {
      {"p_t 2 p_b p_c linear 1 2 3 4", "(1) * [p_b] * [p_c] + (2) * [p_c] + (3) * [p_b] + (4)"},
      {"p_t 3 p_a p_b p_c wsum 1 -2 3", "(1) * [p_a] + (-2) * [p_b] + (3) * [p_c]"},
      {"p_t 1 p_b exp 10 2 3 4", "(2) * (10) ^ ((3) * [p_b]) + (4)"},
      {"p_t 1 p_b exp exp 2 3 4", "(2) * exp((3) * [p_b]) + (4)"},
  };
  for (const auto& [line, equation] : cases) {
    const ImportedCase made = importOstrich(edited(kOstrichCase, {{"p_t 1 p_b linear 2.0 1.0 free", line}}));
    EXPECT_EQ(made.parameter("p_t")->equation, equation);
    EXPECT_THAT(made.notes.text(), HasSubstr(std::string("ostIn.txt:23: read as p_t = ") + equation));
  }
}

TEST_F(OstrichCase, InstructionsFindTheNumbersThatColumnsName) {
  const char* const kListing = "the heads\n 1.5  2.5 3.5\nn = 4\nthe second\n5,6,7\n";
  EXPECT_EQ(readFrom(kListing, {}), "o1 = 1.5, o2 = 2.5; o3 = 4; o4 = 6; ");
  // The order of lines is none of the columns; the first line is line 0.
  EXPECT_EQ(readFrom("0.5 x 0.25\n9 8 7\nn = 4\nthe second\n5,6\n", {{"OST_NULL 1 1 ' ' no", "OST_NULL 1 3 ' ' no"},
                                                                     {"OST_NULL 1 2 ' ' yes", "OST_NULL 0 3 ' ' yes"}}),
            "o2 = 0.25, o1 = 7; o3 = 4; o4 = 6; ");
  EXPECT_EQ(readFrom(kListing, {{"; n 0 3 ' '", "; \"the second\" 1 3 ','"}}), "o1 = 1.5, o2 = 2.5; o4 = 6, o3 = 7; ");
  EXPECT_THAT(importOstrich(kOstrichCase).notes.text(), Not(HasSubstr("counted from the keyword")));
  folder_.write("src/out.dat", edited(kListing, {{"n = 4", "it is n = 4"}}));
  EXPECT_THAT(importOstrich(kOstrichCase).notes.text(),
              HasSubstr("ostIn.txt:29: columns in the line of the keyword \"n\" are counted from the keyword on"));
  folder_.write("src/out.dat", "nothing\n");
  EXPECT_THAT(importOstrich(kOstrichCase).notes.text(),
              HasSubstr("ostIn.txt:27: mirevo_1.ins does not read the out.dat that is here: out.dat:1:"));
}

TEST_F(OstrichCase, OtherSearchesCostsAndBlocksAreTranslatedOrListed) {
  const ImportedCase sce = importOstrich(
      edited(kOstrichCase,
             {{"ProgramType  DDS", "ProgramType SCEUA"},
              {"BeginDDSAlg\nPerturbationValue 0.25\nMaxIterations 60\nUseInitialParamValues\nFunny 3\nEndDDSAlg",
               "BeginSCEUA\nBudget 500\nNumComplexes 3\nNumPointsPerComplex 9\nPctChangeCriteria 0.01\n"
               "UseInitialPoint yes\nMinNumComplexes 1\nEndSCEUA"}}));
  EXPECT_EQ(std::tuple(sce.task.algorithm, sce.task.evaluations, sce.task.complexes, sce.task.pointsOfComplex),
            std::tuple("SCE", 500, 3, 9));
  EXPECT_EQ(sce.task.leastChange, 0.01);
  EXPECT_TRUE(sce.task.includesInitial);
  EXPECT_THAT(sce.notes.text(), HasSubstr("ostIn.txt:41: MinNumComplexes 1"));

  const ImportedCase gcop =
      importOstrich(edited(kOstrichCase, {{"ModelSubdir .", "ObjectiveFunction GCOP"},
                                          {"BeginConstraints\nc1 general 1E6 0 10 o1\nEndConstraints",
                                           "BeginResponseVars\ncost out.dat ; OST_NULL 0 2 ' ' no\nEndResponseVars\n"
                                           "BeginGCOP\nCostFunction cost\nPenaltyFunction APM\nEndGCOP"}}));
  ASSERT_EQ(gcop.objectives.size(), 1U);
  EXPECT_EQ(gcop.objectives[0].type, FunctionType::sum);
  EXPECT_FALSE(gcop.measures.back().observedValue.has_value());
  EXPECT_THAT(gcop.notes.text(), AllOf(HasSubstr("ostIn.txt:37: PenaltyFunction APM"),
                                       HasSubstr("ostIn.txt:27-29: with ObjectiveFunction GCOP observations count")));

  const std::string account =
      importOstrich(edited(kOstrichCase, {{"ProgramType  DDS", "ProgramType ParticleSwarm"}})).notes.text();
  for (const char* expected :
       {"ostIn.txt:2: ProgramType ParticleSwarm has no counterpart", "ostIn.txt:5: PreserveBestModel save.sh",
        "ostIn.txt:28: augmented output: yes", "ostIn.txt:30: a weight of 0",
        "ostIn.txt:32: BeginConstraints: not in effect", "ostIn.txt:33: c1 general 1E6 0 10 o1",
        "ostIn.txt:35: BeginDDSAlg", "ostIn.txt:36: PerturbationValue 0.25"}) {
    EXPECT_THAT(account, HasSubstr(expected));
  }
}

TEST_F(OstrichCase, RefusesWhatItCannotTranslateWithItsPlace) {
  const std::tuple<Edits, const char*> cases[] = {
      {{{"EndParams", "EndParam"}}, "ostIn.txt:18: expected EndParams, found EndParam"},
      {{{"EndDDSAlg\n", ""}}, "ostIn.txt:35: expected EndDDSAlg behind it, found the end of the file"},
      {{{"EndFilePairs\n", ""}}, "ostIn.txt:12: expected EndFilePairs of the block that begins in line 9"},
      {{{"ModelExecutable", "ModelExec"}}, "ostIn.txt: expected ModelExecutable"},
      {{{"in.tpl ; in.dat", "in.tpl in.dat"}}, "ostIn.txt:10: expected a template ; and a file of the model"},
      {{{"p_a   1.0   0.01", "p_a   1.0   x"}}, "ostIn.txt:15: expected a number as word 3, found \"x\""},
      {{{"p_a   1.0   0.01", "p_a   1.0   0"}}, "ostIn.txt:15: expected a lower bound above 0"},
      {{{"p_a   1.0 ", "p_a  1000 "}}, "ostIn.txt:15: expected an initial value between the bounds 0.01 and 100"},
      {{{"none log10 none", "none sqrt none"}}, "ostIn.txt:15: expected none, log10 or ln as word 6, found \"sqrt\""},
      {{{"p_n 2", "p_a 2"}}, "ostIn.txt:20: the parameter p_a is there twice"},
      {{{"p_b linear 2.0", "p_b dist 2.0"}}, "ostIn.txt:23: expected a tied parameter of type linear"},
      {{{"p_t 1 p_b", "p_t 1 p_z"}}, "ostIn.txt:23: expected the name of a parameter, found \"p_z\""},
      {{{"o1  3.0", "o1  three"}}, "ostIn.txt:27: expected a name, a value and a weight"},
      {{{"OST_NULL 1 1", "OST_NULL 1 0"}},
       "ostIn.txt:27: expected a file ; a keyword, a line from 0 and a column from 1"},
      {{{"OST_NULL 1 2", "OST_NULL 1 1"}}, "ostIn.txt:28: expected another column and the same separator as o1"},
      {{{"MaxIterations 60", "MaxIterations many"}}, "ostIn.txt:37: expected an integer from 1 for MaxIterations"},
      {{{"in.tpl ;", "../in.tpl ;"}}, "ostIn.txt:10: expected a file in the folder of ostIn.txt or below it"},
  };
  for (const auto& [edits, expected] : cases) EXPECT_THAT(refusalOfOstrich(edits), HasSubstr(expected));
}

TEST_F(OstrichCase, NamesInTemplatesAreMarkedWhereverTheyAre) {
  ImportNotes notes;
  EXPECT_EQ(markedTemplate("t", "x=k1,k12\nab_k1 ~\n", {"k1", "k12"}, 3, notes),
            "ptf @\nx=@k1      @,@k12     @\nab_@k1      @ ~\n");
  EXPECT_THAT(notes.text(), HasSubstr("t:2: k1 is a part of a word here"));
}

}  // namespace
}  // namespace mirevo::testing

#include "platform/equations/expression_evaluator.h"

#include <cmath>
#include <limits>
#include <locale>
#include <sstream>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "refusal.h"

namespace mirevo {
namespace {

/// Names that are easy to confuse with each other, with functions, constants, numbers and operators.
class ExpressionEvaluatorTest : public ::testing::Test {
 protected:
  std::string refused(const std::string& equation) {
    return refusalOf([&] { evaluator.compile(equation); });
  }

  std::vector<std::string> names{"a",  "ab",  "A",    "Manning n.1", "K.1", "max",
                                 "2k", "a-b", "höhe", "it's",        "v1",  "x]y   "};
  std::vector<double> values{2, 3, 5, 0.035, 7, 11, 13, 17, 19, 23, 29, 31};
  ExpressionEvaluator evaluator{names, values};
};

TEST_F(ExpressionEvaluatorTest, ComputesAsWritten) {
  // "equation = value", some on a line.
  std::istringstream cases(R"(
      # precedence and signs
      1 + 2 * 3 ^ 2 = 19; 2 ^ 3 ^ 2 = 512; 2 ** 3 = 8; -2 ^ 2 = -4; 2 ^ -2 = 0.25; 2 ^ -2 ^ 2 = 0.0625; 2 * -3 = -6
      1 - -1 = 2; 1---1 = 0; +a - +ab = -1; -a * -ab = 6; 10 - 4 - 3 = 3; 100 / 10 / 5 = 2; -(1 + 2) * 3 = -9
      (((a))) = 2
      # numbers
      1.5E-035 * 1e35 = 1.5; 2.5d1 = 25; .5 + 5. = 5.5; 0.1 + 0.2 = 0.30000000000000004
      # comparison, logic, conditional
      1 < 2 = 1; 2 <= 1 = 0; 1 == 1 && 2 != 3 = 1; 0 || 0 = 0; 1 || 0 && 0 = 1; !0 + 1 = 2; !a == 0 = 1; not(0) = 1
      -!0 = -1; !-!!3 + !!7 = 1; --!!5 + -!!5 = 0; a > 1 ? 10 : 20 = 10; a > 3 ? 10 : a > 1 ? 20 : 30 = 20
      1 ? 0 ? 1 : 2 : 3 = 2; 0 ? 0 ? 1 : 2 : 3 = 3; (a > 1 ? 10 : 20) + 1 = 11; max(a > 1 ? 10 : 20, 3) = 10
      1 + 1 ? 5 : 6 = 5
      # functions
      log(e) = 1; ln(e ^ 2) = 2; log10(1000) = 3; log2(8) = 3; LN(1) + Sqrt(16) = 4; min(3, 1, 2) + max(4) = 5
      mod(-7, 3) = -1; mod(7.5, 2) = 1.5; int(-2.7) + floor(-2.7) + ceil(-2.7) = -7; round(2.5) + round(-2.5) = 0
      sign(-3) + sign(0) + sign(4) = 0; atan2(1, 1) * 4 = 3.141592653589793; pow(2, 10) = 1024; cos(pi) = -1
      abs(-3) = 3
      # names
      a + ab + A = 10; [Manning n.1] * 1000 = 35; "Manning n.1" + 'Manning n.1' = 0.07; K.1 = 7
      max + max(1, max) = 22; [2k] + 2 = 15; [a-b] + a-ab = 16; höhe = 19; [it's] + 'it''s' + "it's" = 69
      [x]]y] + [x]]y ] = 62; v1 = 29)");
  int count = 0;
  for (std::string line; std::getline(cases, line);) {
    std::istringstream parts(line.find('#') == std::string::npos ? line : "");
    for (std::string part; std::getline(parts, part, ';'); ++count) {
      const auto equals = part.rfind(" = ");
      ASSERT_NE(equals, std::string::npos) << part;
      double value = std::nan("");
      EXPECT_EQ(refusalOf([&] { value = evaluator.EvaluateExpression(part.substr(0, equals)); }), "accepted");
      EXPECT_DOUBLE_EQ(value, std::stod(part.substr(equals + 3))) << part;
    }
  }
  EXPECT_EQ(count, 63);
}

TEST_F(ExpressionEvaluatorTest, UndefinedValuesAreValues) {
  EXPECT_TRUE(std::isnan(evaluator.EvaluateExpression("ln(-1)")));
  EXPECT_TRUE(std::isnan(evaluator.EvaluateExpression("min(1, 0 / 0)")));
  EXPECT_TRUE(std::isnan(evaluator.EvaluateExpression("max(0 / 0, 1)")));
  EXPECT_EQ(evaluator.EvaluateExpression("1 / 0"), std::numeric_limits<double>::infinity());
}

TEST_F(ExpressionEvaluatorTest, FollowsItsVariables) {
  const auto expression = evaluator.compile("a * 10 + [2k]");
  EXPECT_EQ(expression->evaluate(), 33);
  values[0] = 4;
  values[6] = 1;
  EXPECT_EQ(expression->evaluate(), 41);
}

TEST_F(ExpressionEvaluatorTest, FindsNamesAndNotPartsOfThem) {
  const auto variables = [this](const char* equation) { return evaluator.compile(equation)->variables(); };
  using Indices = std::vector<std::size_t>;
  EXPECT_EQ(variables("ab * A + ab"), (Indices{1, 2}));
  EXPECT_EQ(variables("[a-b]"), (Indices{7}));
  EXPECT_EQ(variables("max(1, 2) + exp(1)"), Indices{});
  EXPECT_TRUE(evaluator.NameAppearsIn("1 + [Manning n.1]", "Manning n.1   "));
  EXPECT_FALSE(evaluator.NameAppearsIn("ab", "a"));
  EXPECT_EQ(refusalMessageOf([this] { evaluator.NameAppearsIn("ab", "b"); }),
            "Error: In the check of bappear in expression ab");
}

TEST_F(ExpressionEvaluatorTest, SaysWhatIsWrongAndWhere) {
  const std::tuple<const char*, const char*> cases[] = {
      {"", "column 1: the equation is empty"},
      {"1 +", "column 4: the equation ends where"},
      {"höhe höhe", "column 6: an operator is expected"},
      {"a = 5", "column 3: \"=\" is no operator of an equation\n    a = 5\n      ^\nwrite == to compare two values"},
      {"a <> 5", "column 3: \"<>\" is no operator of an equation\n    a <> 5\n      ^\ndid you mean !=?"},
      {"a => 5", "did you mean >=?"},
      {"(a", "column 1: \"(\" has no \")\""},
      {"a)", "column 2: \")\" without"},
      {"()", "column 2: a number, a name"},
      {"1,2", "column 2: a comma stands only between"},
      {"exp(1,2)", "exp() takes 1 argument, not 2"},
      {"pow(1)", "pow() takes 2 arguments, not 1"},
      {"a ? 1", "column 3: \"?\" has no \":\""},
      {"a ? (1 : 2)", "column 8: \":\" without"},
      {"1 : 2", "column 3: \":\" without"},
      {"2k + 1", "write the parameter as [2k]"},
      {"1e999", "column 1: \"1e999\" is not a number within"},
      {"1.2.3", "neither a number nor a name"},
      {"aB + 1", "did you mean \"ab\"?"},
      {"[Maning n.1]", "no parameter is called \"Maning n.1\"\n    [Maning n.1]\n    ^\ndid you mean \"Manning n.1\"?"},
      {"sqr(2)", "no function is called \"sqr\""},
      {"a(2)", "column 2: an operator is expected, not \"(\""},
      {"[pi]", "no parameter is called \"pi\""},
      {"[a", "column 1: the name that begins here has no closing ]"},
      {"a & a", "write &&"},
      {"a \x01", "an operator is expected, not the control character 1"},
  };
  for (const auto& [equation, detail] : cases) {
    EXPECT_THAT(refused(equation), AllOf(StartsWith("Error: Unable to create the expression "),
                                         HasSubstr(" in equation parser\n"), HasSubstr(detail)));
  }
  EXPECT_THAT(refused(" 1 + "), StartsWith("Error: Unable to create the expression 1 + in equation parser\n"));
}

TEST_F(ExpressionEvaluatorTest, LimitsNestingAndLength) {
  const auto repeated = [](const char* text, int count) {
    std::string result;
    for (int i = 0; i < count; ++i) result += text;
    return result;
  };
  EXPECT_EQ(evaluator.EvaluateExpression(repeated("(", 100) + "1" + repeated(")", 100)), 1);
  EXPECT_THAT(refused(repeated("(", 101) + "1" + repeated(")", 101)), HasSubstr("more than 100 deep"));
  EXPECT_EQ(evaluator.EvaluateExpression(repeated("-", 9999) + "1"), -1);
  EXPECT_EQ(evaluator.EvaluateExpression(repeated("0 ? 1 : ", 100) + "7"), 7);
  EXPECT_THAT(refused(repeated("0 ? 1 : ", 101) + "7"), HasSubstr("more than 100 conditionals"));
  EXPECT_NEAR(evaluator.EvaluateExpression(repeated("[Manning n.1] + ", 600) + "0"), 21, 1e-9);
  EXPECT_THAT(refused(repeated("1+", 4999) + "1"), HasSubstr("too many terms"));
  EXPECT_THAT(refused(repeated("1+", 5000) + "1"),
              AllOf(HasSubstr("longer than 10000"), HasSubstr("1+... (10001 characters) in equation parser"),
                    ::testing::SizeIs(::testing::Lt(500U))));
}

TEST(ExpressionEvaluator, RefusesNamesThatCannotBeVariables) {
  for (const std::string& name :
       {std::string("   "), std::string(256, 'x'), std::string("a\tb"), std::string("twice")}) {
    std::vector<std::string> names{"twice", name};
    std::vector<double> values(2);
    EXPECT_THAT(refusalOf([&] { const ExpressionEvaluator evaluator(names, values); }),
                StartsWith("Error: Unable to create the parameter "));
  }
}

TEST(ExpressionEvaluator, ParametersHideConstants) {
  std::vector<std::string> names{"e", "PI"};
  std::vector<double> values{100, 3};
  const ExpressionEvaluator evaluator(names, values);
  EXPECT_EQ(evaluator.EvaluateExpression("e + PI"), 103);
  EXPECT_THROW(evaluator.compile("pi"), FatalError) << "pi where a parameter PI exists is a slip of the pen";
}

/// A decimal comma, whichever locales are installed.
class DecimalComma final : public std::numpunct<char> {
  char do_decimal_point() const override { return ','; }
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

TEST(ExpressionEvaluator, DoesNotFollowTheLocale) {
  const std::locale previous = std::locale::global(std::locale(std::locale::classic(), new DecimalComma));
  const ExpressionEvaluator evaluator({}, {});
  EXPECT_EQ(evaluator.EvaluateExpression("max(1.5, 1) + 1234.25"), 1235.75);
  std::locale::global(previous);
}

}  // namespace
}  // namespace mirevo

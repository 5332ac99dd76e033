#include "algorithms/numbers/special_functions.h"

#include <cmath>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

struct Value {
  double argument, expected;
};

// All expected values were computed with 60 decimal digits, apart from this program, at the arguments as rounded to
// 64 bits.
TEST(NormalQuantile, HasItsValues) {
  const Value values[] = {{1e-300, -37.047096299361199},   {1e-20, -9.2623400897984076},
                          {1.38e-11, -6.6588385028507655}, {0.0001, -3.7190164854556806},
                          {0.025, -1.9599639845400542},    {0.0749, -1.4402382675279637},
                          {0.075, -1.4395314709384559},    {0.25, -0.67448975019608174},
                          {0.4, -0.25334710313579974},     {0.5, 0.0},
                          {0.6, 0.25334710313579974},      {0.975, 1.9599639845400539},
                          {0.99, 2.3263478740408408},      {0.9999999, 5.1993375822906611}};
  for (const Value& v : values) {
    int fault = 9;
    EXPECT_NEAR(normalQuantile(v.argument, fault), v.expected, 1e-15 * std::abs(v.expected)) << v.argument;
    EXPECT_EQ(fault, 0);
  }
}

TEST(LogGamma, HasItsValues) {
  const Value values[] = {{1e-300, 690.77552789821371},  {1e-8, 18.420680738180209},  {1e-3, 6.9071788853838537},
                          {0.5, 0.57236494292470009},    {1.5, -0.12078223763524522}, {2.001, 0.00042310673480011699},
                          {3, 0.69314718055994531},      {12.5, 18.734347511936446},  {13, 19.987214495661886},
                          {100, 359.1342053695754},      {1e6, 12815504.569147612},   {1e10, 220258509288.81058},
                          {1e36, 8.1893063347785648e+37}};
  for (const Value& v : values) {
    int fault = 9;
    EXPECT_NEAR(logGamma(v.argument, fault), v.expected, 2e-15 * std::max(std::abs(v.expected), 5.0)) << v.argument;
    EXPECT_EQ(fault, 0);
  }
  int fault = 9;
  EXPECT_EQ(logGamma(1.0, fault), 0.0);
  EXPECT_EQ(logGamma(2.0, fault), 0.0);
  // Near the zeros the branches keep the relative accuracy that the series would lose.
  EXPECT_NEAR(logGamma(1.00000005, fault), -2.8860781141676168e-8, 1e-22);
  EXPECT_NEAR(logGamma(1.99999995, fault), -2.1139215914159772e-8, 1e-22);
}

TEST(Digamma, HasItsValues) {
  const Value values[] = {{1e-12, -1000000000000.5772}, {1e-5, -100000.57719921567}, {0.5, -1.9635100260214235},
                          {1, -0.57721566490153286},    {2, 0.42278433509846714},    {12.9, 2.5179671503279156},
                          {13, 2.5259950133091454},     {1000, 6.9072551956488121},  {1e15, 34.538776394910685}};
  for (const Value& v : values) {
    int fault = 9;
    EXPECT_NEAR(digamma(v.argument, fault), v.expected, 5e-16 * std::max(std::abs(v.expected), 4.0)) << v.argument;
    EXPECT_EQ(fault, 0);
  }
}

TEST(IncompleteGamma, HasItsValuesInEachBranch) {
  const std::tuple<double, double, double, double> cases[] = {{1, 0.5, 0.39346934028736658, 1e-13},
                                                              {0.5, 0.1, 0.34527915398142298, 1e-13},
                                                              {3, 3, 0.57680991887315648, 1e-13},
                                                              {3, 20, 0.99999954448504944, 1e-13},
                                                              {100, 120, 0.97213626010947934, 1e-13},
                                                              {5000, 4900, 0.077944956226513914, 1e-12},
                                                              {5000, 5100, 0.92067111892238102, 1e-12},
                                                              {9999, 10300, 0.9985764914528928, 1e-12},
                                                              {0.001, 0.5, 0.99943993334352925, 1e-13},
                                                              {0.01, 50, 1.0, 1e-13},
                                                              {20000, 20300, 0.98270644872209655, 1e-9},
                                                              {1e6, 1000500, 0.69155047577149718, 1e-9},
                                                              {1e6, 1e300, 1.0, 0.0},
                                                              {2.5, INFINITY, 1.0, 0.0},
                                                              {500.0, 1e-3, 0.0, 0.0},
                                                              {3, 0.0, 0.0, 0.0}};
  for (const auto& [shape, x, expected, tolerance] : cases) {
    int fault = 9;
    const double g = logGamma(shape, fault);
    EXPECT_NEAR(incompleteGamma(x, shape, g, fault), expected, tolerance) << shape << " " << x;
    EXPECT_EQ(fault, 0) << shape << " " << x;
  }
}

TEST(SpecialFunctions, ReportAFaultWithItsMessageAndZero) {
  const auto check = [](const std::string& message, const auto& call, std::initializer_list<double> arguments) {
    for (const double argument : arguments) {
      std::vector<std::string> messages;
      int fault = 9;
      EXPECT_EQ(call(argument, fault, [&](std::string_view text) { messages.emplace_back(text); }), 0.0) << message;
      EXPECT_EQ(fault, 1) << message;
      EXPECT_EQ(messages, std::vector<std::string>{" *** ERROR *** " + message});
      fault = 9;
      call(argument, fault, {});  // without a channel the fault alone is reported
      EXPECT_EQ(fault, 1) << message;
    }
  };
  using Sink = const MessageSink&;
  const std::string gamma = "INCOMPLETE GAMMA INTEGRAL : ";
  check("QUANTILE FUNCTION OF STANDARD NORMAL DISTRIBUTION : ARGUMENT OF FUNCTION INVALID", normalQuantile,
        {0.0, 1.0, -0.1, 1.5, NAN});
  check("LOGARITHM OF GAMMA FUNCTION : ARGUMENT OUT OF RANGE", logGamma, {0.0, 2.1e36, NAN});
  check("EULER PSI FUNCTION : ARGUMENT OUT OF RANGE", digamma, {0.0, -1.0});
  check(gamma + "SHAPE PARAMETER OUT OF RANGE",
        [](double shape, int& fault, Sink sink) { return incompleteGamma(1.0, shape, 0.0, fault, sink); },
        {0.0, -1.0, INFINITY});
  check(gamma + "ARGUMENT OF FUNCTION OUT OF RANGE",
        [](double x, int& fault, Sink sink) { return incompleteGamma(x, 1.0, 0.0, fault, sink); }, {-1e-9, NAN});
}

}  // namespace
}  // namespace mirevo

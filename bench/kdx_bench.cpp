// Reading a setup must take time proportional to its length: the time per parameter should be the same for all three
// sizes.
#include <string>
#include <variant>

#include <benchmark/benchmark.h>
#include <fmt/format.h>

#include "platform/kdx/kdx.h"

namespace mirevo {
namespace {

std::string setupOf(std::int64_t parameterCount) {
  std::string text = fmt::format("[MODEL_PARAMETERS]\n  TqSEKdxListItemCount = {}\n", parameterCount);
  for (std::int64_t i = 1; i <= parameterCount; ++i) {
    text += fmt::format(
        "  [PARAMETER_{0}]\n    Initial_Value = {0}.5\n    Lower_Bound = 0.0\n    Upper_Bound = 1.0E6\n"
        "    Transformation_Type = 0\n    Parameter_Type = 0\n    Parameter_Name = 'parameter {0}'\n  "
        "[/PARAMETER_{0}]\n",
        i);
  }
  return text + "[/MODEL_PARAMETERS]\n";
}

void reportPerParameter(benchmark::State& state) {
  state.SetItemsProcessed(state.iterations() * state.range(0));
  state.SetComplexityN(state.range(0));
}

void parse(benchmark::State& state) {
  const std::string text = setupOf(state.range(0));
  for (auto _ : state) benchmark::DoNotOptimize(parseKdx("bench.kdx", text));
  reportPerParameter(state);
}
BENCHMARK(parse)->Arg(1000)->Arg(10000)->Arg(100000)->Unit(benchmark::kMillisecond)->Complexity();

void lookUpEveryParameter(benchmark::State& state) {
  const auto parsed = parseKdx("bench.kdx", setupOf(state.range(0)));
  const KdxSection* list = std::get<KdxDocument>(parsed).root.section("MODEL_PARAMETERS");
  for (auto _ : state) {
    for (std::int64_t i = 1; i <= state.range(0); ++i) {
      const KdxSection* parameter = list->section(fmt::format("PARAMETER_{}", i));
      benchmark::DoNotOptimize(parameter->keyword("Parameter_Name"));
    }
  }
  reportPerParameter(state);
}
BENCHMARK(lookUpEveryParameter)->Arg(1000)->Arg(10000)->Arg(100000)->Unit(benchmark::kMillisecond)->Complexity();

}  // namespace
}  // namespace mirevo

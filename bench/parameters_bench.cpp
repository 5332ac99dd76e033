// The time for the parameters: setting up a large model once, then mapping a set and writing a file for every model
// run.

#include <filesystem>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>
#include <fmt/format.h>

#include "common/files.h"
#include "parameters/parameter_model.h"
#include "parameters/template_file.h"

namespace mirevo {
namespace {

/// `count` parameters, of which the first `dependents` are dependent and name the next one each: the order in the setup
/// is the reverse of the order of evaluation, the worst case for the ordering.
std::vector<ModelParameter> chain(std::size_t count, std::size_t dependents) {
  std::vector<ModelParameter> parameters(count);
  for (std::size_t i = 0; i < count; ++i) {
    parameters[i].name = fmt::format("parameter_{}", i + 1);
    parameters[i].initialValue = 0.5;
    parameters[i].upperBound = 1.0;
    if (i >= dependents) continue;
    parameters[i].parameterType = ParameterType::dependent;
    parameters[i].equation = fmt::format("0.5 * parameter_{} + 0.1 * max(parameter_{}, 0.2)", i + 2, count);
  }
  return parameters;
}

void setUpModel(benchmark::State& state) {
  const std::vector<ModelParameter> parameters =
      chain(static_cast<std::size_t>(state.range(0)), static_cast<std::size_t>(state.range(1)));
  for (auto _ : state) {
    const ParameterModel model(parameters, {});
    benchmark::DoNotOptimize(model.evaluationOrder().data());
  }
}
BENCHMARK(setUpModel)->Args({10, 3})->Args({1000, 300})->Args({5000, 4000})->Unit(benchmark::kMillisecond);

void mapToModelValues(benchmark::State& state) {
  const std::vector<ModelParameter> parameters =
      chain(static_cast<std::size_t>(state.range(0)), static_cast<std::size_t>(state.range(1)));
  const std::string last = parameters.back().name;
  ParameterModel model(parameters, {{last, "2", LogicalOperator::less}});
  const std::vector<double> set = model.searchSpace().initial;
  for (auto _ : state) benchmark::DoNotOptimize(model.MapToModelValues(set));
}
BENCHMARK(mapToModelValues)->Args({10, 3})->Args({1000, 300})->Unit(benchmark::kMicrosecond);

std::string templateText(int lines) {
  std::string text = "!\n";
  for (int i = 0; i < lines; ++i)
    text += fmt::format("  layer {:3}  depth 0.35  conductivity !parameter_{}    !\n", i, i % 10 + 1);
  return text;
}

void fillTemplate(benchmark::State& state) {
  const std::vector<ModelParameter> parameters = chain(10, 0);
  const ParameterTemplate parameterTemplate("bench.tpl", templateText(static_cast<int>(state.range(0))), parameters);
  const std::vector<double> values(10, 0.123456789);
  for (auto _ : state) benchmark::DoNotOptimize(parameterTemplate.fill(values));
}
BENCHMARK(fillTemplate)->Arg(100)->Unit(benchmark::kMicrosecond);

void writeParameterFile(benchmark::State& state) {
  const std::vector<ModelParameter> parameters = chain(10, 0);
  const ParameterTemplate parameterTemplate("bench.tpl", templateText(static_cast<int>(state.range(0))), parameters);
  const std::vector<double> values(10, 0.123456789);
  const std::string path = (std::filesystem::temp_directory_path() / "mirevo_parameters_bench.inp").string();
  std::string reason;
  writeByUnlinkAndCreate(path, "", 0600, reason);
  for (auto _ : state) WriteParameterFile(path, parameterTemplate, values);
  std::filesystem::remove(path);
}
BENCHMARK(writeParameterFile)->Arg(100)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace mirevo

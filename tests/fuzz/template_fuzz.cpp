// Any text as a template of either style: it is filled, or refused with a FatalError; converting comes to an end.

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "common/fatal_error.h"
#include "parameters/template_file.h"
#include "parameters/value_format.h"

namespace {

void fill(std::string_view text, const std::vector<mirevo::ModelParameter>& parameters,
          const std::vector<double>& values) {
  const mirevo::ParameterTemplate parameterTemplate("fuzz.tpl", text, parameters);
  const std::string content = parameterTemplate.fill(values);
  if (content.find(" \n") != std::string::npos) std::abort();
  parameterTemplate.narrowPlaceholderWarnings(parameters);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < 8) return 0;
  static const std::vector<mirevo::ModelParameter> parameters = [] {
    std::vector<mirevo::ModelParameter> list(3);
    const char* names[] = {"K", "a 1e-35", "n  "};
    for (std::size_t i = 0; i < list.size(); ++i) {
      list[i].name = names[i];
      list[i].idValue = static_cast<double>(i + 1) * 1e-35;
      list[i].lowerBound = -2.0;
      list[i].upperBound = 3.0e5;
    }
    return list;
  }();
  double value = 0.0;
  static_assert(sizeof value == 8);
  std::copy(data, data + 8, reinterpret_cast<std::uint8_t*>(&value));
  const std::string_view text(reinterpret_cast<const char*>(data) + 8, size - 8);
  const std::vector<double> values{value, 0.25, -1e9};
  for (int width = 0; width < 30; ++width) {
    if (mirevo::FormatValueForPlaceholder(value, width).size() != static_cast<std::size_t>(width)) std::abort();
  }
  try {
    fill(text, parameters, values);
  } catch (const mirevo::FatalError&) {
  }
  try {
    fill(mirevo::ConvertIdTemplate("fuzz.tpl", text, parameters), parameters, values);
  } catch (const mirevo::FatalError&) {
  }
  return 0;
}

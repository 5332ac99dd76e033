// The KDX parser and, on whatever it takes for a setup, the setup reader: any text ends in a configuration or in a
// FatalError that names its place.
#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "common/fatal_error.h"
#include "platform/kdx/kdx.h"
#include "run/setup/setup_reader.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const auto parsed = mirevo::parseKdx("fuzz.kdx", text);
  if (const auto* error = std::get_if<mirevo::KdxSyntaxError>(&parsed)) {
    if (error->position.line < 1 || error->position.column < 1 || error->message.empty()) std::abort();
    return 0;
  }
  mirevo::RunLog log;
  try {
    mirevo::readSetup("fuzz.kdx", text, log);
  } catch (const mirevo::FatalError& error) {
    if (error.message().empty() || !std::string_view(error.detail()).starts_with("fuzz.kdx")) std::abort();
  }
  return 0;
}

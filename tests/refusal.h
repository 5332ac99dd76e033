#pragma once

#include <string>

#include "common/fatal_error.h"

namespace mirevo {

/// "message\ndetail" of the FatalError that `call` ends in, the message alone where there is no detail; "accepted"
/// when it ends well.
template <typename Call>
std::string refusalOf(const Call& call) {
  try {
    call();
  } catch (const FatalError& error) {
    return error.detail().empty() ? error.message() : error.message() + "\n" + error.detail();
  }
  return "accepted";
}

/// The message alone, without the detail.
template <typename Call>
std::string refusalMessageOf(const Call& call) {
  const std::string refusal = refusalOf(call);
  return refusal.substr(0, refusal.find('\n'));
}

}  // namespace mirevo

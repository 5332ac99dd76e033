#pragma once

#include <string>

namespace mirevo {

/// The library that computes equations and its version: "muParser 2.3.3".
std::string equationLibrary();

}  // namespace mirevo

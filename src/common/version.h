#pragma once

#include <string_view>

namespace mirevo {

/// The program's version, "0.1.0".
std::string_view programVersion();

}  // namespace mirevo

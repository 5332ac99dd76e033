#pragma once

#include <string>

namespace mirevo {

/// The reference page of the manual (Markdown), made from the keyword rows: docs/setup-reference.md.
std::string setupReference();

}  // namespace mirevo

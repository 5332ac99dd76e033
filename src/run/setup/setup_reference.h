#pragma once

#include <string>

namespace mirevo {

/// The reference page of the manual (Markdown), made from the keyword table: docs/setup-reference.md.
std::string setupReference();

}  // namespace mirevo

#pragma once

#include <string>
#include <string_view>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// The reference page of the manual (Markdown), made from the keyword rows: docs/setup-reference.md.
std::string setupReference();

/// How the manual calls a type: "integer", "file".
std::string_view keywordTypeName(KeywordType type);

}  // namespace mirevo

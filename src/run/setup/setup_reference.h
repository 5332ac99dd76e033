#pragma once

#include <string>
#include <string_view>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// The reference page of the manual (Markdown), made from the keyword rows: docs/setup-reference.md.
std::string setupReference();

/// How the manual calls a type: "integer", "file".
std::string_view keywordTypeName(KeywordType type);

/// The valid numbers of a keyword, "0 or a name" where some of its values have a name only; empty for any.
std::string validText(const KeywordRow& row);

}  // namespace mirevo

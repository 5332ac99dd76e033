#pragma once

#include <string>

#include "platform/series/text_form.h"

namespace mirevo {

/// Whether the items of a file are the same in both forms, however they are written: a default may be written out, and
/// a separator have two names. Which values are missing may differ.
bool isReadAlike(const std::string& fileName, const TextForm& a, const TextForm& b);

/// Whether both have the same missing values, in any order.
bool hasSameMissingValues(const TextForm& a, const TextForm& b);

}  // namespace mirevo

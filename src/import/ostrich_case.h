#pragma once

#include <string>
#include <string_view>

#include "import/imported_case.h"
#include "import/source_files.h"

namespace mirevo {

/// Makes a case of an input file of Ostrich (`ostIn.txt`); `name` is its name without a folder. Throws FatalError with
/// the place of what cannot be imported.
ImportedCase importOstrichInput(const std::string& name, std::string_view text, const SourceFiles& files);

}  // namespace mirevo

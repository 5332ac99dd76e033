#pragma once

#include <string>

#include "import/imported_case.h"

namespace mirevo {

/// Checks that templates and instruction files of a case fit its parameters and measures, and notes what is left over.
/// Throws FatalError.
void checkCase(ImportedCase& imported);

/// Writes a case as a folder: the setup, the account of the import and a copy of the model's folder with the new files.
/// All or nothing: the folder is made under another name and then renamed. `folder` must not exist. Throws FatalError.
void writeCaseFolder(ImportedCase& imported, const std::string& folder);

}  // namespace mirevo

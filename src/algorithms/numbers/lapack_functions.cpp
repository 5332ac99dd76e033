#include "algorithms/numbers/lapack_functions.h"

#include <string>

#include "common/fatal_error.h"
#include "common/program_module.h"

namespace mirevo {

const LapackFunctions& lapack() {
  static const LapackFunctions* functions = nullptr;
  if (functions == nullptr) {
    std::string reason;
    functions = static_cast<const LapackFunctions*>(contentOfModule("lapack", kLapackFunctionsName, reason));
    if (functions == nullptr) {
      fatalError("Error: The part of Mirevo for linear algebra is missing",
                 reason + ". Install Mirevo again: the program and its folder lib/mirevo belong together.");
    }
    if (functions->setOpenblasThreads != nullptr) functions->setOpenblasThreads(1);
  }
  return *functions;
}

}  // namespace mirevo

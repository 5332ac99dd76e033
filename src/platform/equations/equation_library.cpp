#include "platform/equations/equation_library.h"

#include <muParser.h>

namespace mirevo {

std::string equationLibrary() {
  const std::string version = mu::Parser().GetVersion(mu::pviBRIEF);
  return "muParser " + version.substr(0, version.find(' '));
}

}  // namespace mirevo

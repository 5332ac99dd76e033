#include "common/version.h"

namespace mirevo {

std::string_view programVersion() {
  return MIREVO_VERSION;
}

}  // namespace mirevo

#include "common/fatal_error.h"

#include <utility>

namespace mirevo {

FatalError::FatalError(std::string message, std::string detail)
    : message_(std::move(message)), detail_(std::move(detail)) {}

void fatalError(std::string_view message, std::string_view detail) {
  throw FatalError(std::string(message), std::string(detail));
}

}  // namespace mirevo

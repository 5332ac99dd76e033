#include "report/page/page_template.h"

namespace mirevo {

std::string_view reportPageTemplate() {
  return {};
}

}  // namespace mirevo

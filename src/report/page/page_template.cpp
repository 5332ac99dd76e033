#include "report/page/page_template.h"

// The assembler takes the file in as it is: a string literal of this size would cost every build seconds.
asm(R"(
  .section .rodata
  .global mirevoReportTemplate
  .global mirevoReportTemplateEnd
mirevoReportTemplate:
  .incbin ")" MIREVO_REPORT_TEMPLATE R"("
mirevoReportTemplateEnd:
  .byte 0
  .text
)");

extern "C" {
extern const char mirevoReportTemplate[];
extern const char mirevoReportTemplateEnd[];
}

namespace mirevo {

std::string_view reportPageTemplate() {
  return {mirevoReportTemplate, mirevoReportTemplateEnd};
}

}  // namespace mirevo

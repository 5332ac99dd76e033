#include "platform/series/quality_codes.h"

#include <algorithm>
#include <array>
#include <limits>

#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kSeparators = " ,;:|\t";

}  // namespace

double qualityCode(std::string_view qualifiers) {
  bool isAny = false;
  int status = 0;
  bool isEstimated = false;
  bool isLimit = false;
  bool isOther = false;
  while (!qualifiers.empty()) {
    const std::size_t length = std::min(qualifiers.find_first_of(kSeparators), qualifiers.size());
    const std::string_view code = qualifiers.substr(0, length);
    qualifiers.remove_prefix(std::min(length + 1, qualifiers.size()));
    if (code.empty()) continue;
    isAny = true;
    if (equalIgnoringCase(code, "A")) {
      status = std::max(status, 1);
    } else if (equalIgnoringCase(code, "P")) {
      status = 2;
    } else if (equalIgnoringCase(code, "e")) {
      isEstimated = true;
    } else if (code == "<" || code == ">") {
      isLimit = true;
    } else if (!equalIgnoringCase(code, "R") && code.front() != '[') {
      isOther = true;
    }
  }
  if (!isAny) return std::numeric_limits<double>::quiet_NaN();
  return status + (isEstimated ? 10 : 0) + (isLimit ? 20 : 0) + (isOther ? 40 : 0);
}

bool isRemarkInPlaceOfValue(std::string_view text) {
  constexpr std::array<std::string_view, 16> kRemarks = {"***", "--",  "Bkw", "Dis", "Dry", "Eqp", "Fld", "Ice",
                                                         "Mnt", "Pmp", "Pr",  "Rat", "Ssn", "Tst", "ZFl", "UNDEF"};
  return std::any_of(kRemarks.begin(), kRemarks.end(),
                     [text](std::string_view remark) { return equalIgnoringCase(remark, text); });
}

}  // namespace mirevo

#include "measures/measure_file.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/files.h"
#include "common/text.h"

namespace mirevo {

std::optional<std::vector<double>> parseMeasureFile(const std::string& sourceName, std::string_view content,
                                                    std::string& reason) {
  constexpr std::string_view kSeparators = " \t,;\r";
  std::vector<double> numbers;
  std::size_t lineNumber = 0;
  for (std::string_view line : splitLines(content)) {
    ++lineNumber;
    line = line.substr(0, line.find('#'));
    std::size_t begin = line.find_first_not_of(kSeparators);
    while (begin != std::string_view::npos) {
      const std::size_t end = std::min(line.find_first_of(kSeparators, begin), line.size());
      const std::string_view word = line.substr(begin, end - begin);
      const std::optional<double> number = parseReal(word);
      if (!number) {
        constexpr std::size_t kLongest = 60;
        const std::string fault = faultOfEncoding(content);
        reason = fmt::format("{}:{}:{}: expected a number, found {}{}{}", sourceName, lineNumber, begin + 1,
                             quotedForMessage(word.substr(0, kLongest)), fault.empty() ? "" : "; ", fault);
        return std::nullopt;
      }
      numbers.push_back(*number);
      begin = line.find_first_not_of(kSeparators, end);
    }
  }
  return numbers;
}

std::optional<std::vector<double>> readMeasureFile(const std::string& fileName, std::string& reason) {
  std::string systemReason;
  const std::optional<std::string> content = readTextFile(fileName, systemReason);
  if (!content) {
    reason = fileName + ": " + systemReason;
    return std::nullopt;
  }
  return parseMeasureFile(fileName, *content, reason);
}

}  // namespace mirevo

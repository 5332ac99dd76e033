#include "parameters/template_lines.h"

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/fatal_error.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "parameters/template_file.h"

namespace mirevo {

std::string_view trimBlanks(std::string_view text) {
  const auto last = text.find_last_not_of(' ');
  return last == std::string_view::npos ? std::string_view{} : text.substr(0, last + 1);
}

void failLongLine(std::string_view templateName, std::size_t lineNumber, std::size_t length) {
  fatalError(fmt::format("Error: Line {} of template file {} is too long", lineNumber, templateName),
             fmt::format("it has {} characters; a line may have {}, the names of its placeholders included", length,
                         kMaximumLineLength));
}

std::optional<char> delimiterOfPest(std::string_view firstLine) {
  constexpr std::size_t kMark = 3;
  takeText(firstLine, kByteOrderMark);
  firstLine = trim(firstLine);
  if (firstLine.size() <= kMark || !equalIgnoringCase(firstLine.substr(0, kMark), "ptf")) return std::nullopt;
  const std::string_view rest = trim(firstLine.substr(kMark));
  const bool isApart = firstLine[kMark] == ' ' || firstLine[kMark] == '\t';
  if (!isApart || rest.size() != 1) return std::nullopt;
  return rest.front();
}

std::vector<std::string_view> templateLines(std::string_view templateName, std::string_view text) {
  if (const std::string fault = faultOfEncoding(text); !fault.empty()) {
    fatalError(fmt::format("Error: Unable to open template file {}", templateName), fault);
  }
  std::vector<std::string_view> lines = splitLines(text);
  for (std::size_t i = 0; i < lines.size(); ++i) {
    lines[i] = trimBlanks(lines[i]);
    if (lines[i].size() > kMaximumLineLength) failLongLine(templateName, i + 1, lines[i].size());
  }
  return lines;
}

}  // namespace mirevo

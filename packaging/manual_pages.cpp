// manual_pages VERSION setup               writes the manual page of section 5 from the keyword rows
// manual_pages VERSION PROGRAM SUMMARY     one of section 1, from what the program prints for --help
//
// Both read Markdown or help text and write roff to standard output; the help text is read from standard input.

#include <algorithm>
#include <cstdio>
#include <iostream>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/core.h>

#include "common/text.h"
#include "run/setup/setup_reference.h"

namespace mirevo {
namespace {

/// Text that roff prints as it is.
std::string plain(std::string_view text) {
  std::string roff;
  for (const char letter : text) {
    switch (letter) {
      case '\\':
        roff += "\\e";
        break;
      case '-':
        roff += "\\-";
        break;
      case '\'':
        roff += "\\(aq";
        break;
      case '`':
        roff += "\\(ga";
        break;
      case '^':
        roff += "\\(ha";
        break;
      case '~':
        roff += "\\(ti";
        break;
      case '.':
        if (roff.empty()) roff += "\\&";  // no request of roff's
        [[fallthrough]];
      default:
        roff += letter;
    }
  }
  return roff;
}

/// A line of Markdown: `code` becomes bold, *emphasis* italic, and a link the name of the page.
std::string fromMarkdown(std::string_view text) {
  std::string roff;
  std::size_t begin = 0;
  const auto rest = [&] { return text.substr(begin); };
  while (begin < text.size()) {
    const char mark = text[begin];
    const std::size_t end = mark == '[' ? text.find("](", begin) : text.find(mark, begin + 1);
    if (mark == '[' && end != std::string_view::npos && text.find(')', end) != std::string_view::npos) {
      roff += fmt::format("the page on {} of the manual", fromMarkdown(text.substr(begin + 1, end - begin - 1)));
      begin = text.find(')', end) + 1;
    } else if ((mark == '`' || mark == '*') && end != std::string_view::npos && end > begin + 1) {
      roff += fmt::format("{}{}\\fR", mark == '`' ? "\\fB" : "\\fI", plain(text.substr(begin + 1, end - begin - 1)));
      begin = end + 1;
    } else {
      const std::size_t next = rest().find_first_of("`*[", 1);
      const std::size_t length = next == std::string_view::npos ? rest().size() : next;
      roff += plain(rest().substr(0, length));
      begin += length;
    }
  }
  return roff;
}

void header(std::string_view name, int section, std::string_view version, std::string_view summary) {
  fmt::print(".TH {} {} \"\" \"Mirevo {}\" \"{}\"\n.SH NAME\n{} \\- {}\n", plain(name), section, version,
             section == 1 ? "User Commands" : "File Formats", plain(name), plain(summary));
}

std::vector<std::string> cellsOf(std::string_view row) {
  std::vector<std::string> cells;
  for (const std::string_view cell : splitAt(row.substr(1, row.size() - 2), '|')) cells.emplace_back(trim(cell));
  return cells;
}

/// A row of a keyword table: keyword, type, default, valid values, unit, meaning.
void keyword(const std::vector<std::string>& cells) {
  const std::string byDefault = cells[2] == "required" || cells[2] == "none" ? cells[2] : "default " + cells[2];
  fmt::print(".TP\n{}\n{}, {}", fromMarkdown(cells[0]), cells[1], fromMarkdown(byDefault));
  if (!cells[3].empty()) fmt::print("; {}", fromMarkdown(cells[3]));
  if (!cells[4].empty()) fmt::print("; unit: {}", fromMarkdown(cells[4]));
  fmt::print(".\n{}\n", fromMarkdown(cells[5]));
}

constexpr std::string_view kExample = R"([MIREVO_PARAMETERS]
  [MIREVO_SIMULATION_OPTION]
    Option = 'optimisation'   // what the run is for
    Title = 'Upper basin'
    [SIMBATCH]
      TqSEKdxListItemCount = 1
      [SIMBATCHITEM_1]
        BatchFileName = 'model/run.sh'
      [/SIMBATCHITEM_1]
    [/SIMBATCH]
  [/MIREVO_SIMULATION_OPTION]
[/MIREVO_PARAMETERS]
)";

std::string_view pathOf(std::string_view section) {
  return section.substr(0, section.find('\n'));
}

/// The reference with each section beside the others of the section that it is in, whenever it is read.
std::string reordered(std::string_view reference) {
  constexpr std::string_view kHeading = "\n## ";
  std::vector<std::string_view> sections;  // from the path on; the first is the introduction
  while (true) {
    const std::size_t end = reference.find(kHeading);
    const std::string_view section = reference.substr(0, end);
    const std::string_view path = pathOf(section);
    const std::string_view parent = path.substr(0, path.rfind('/') + 1);
    auto after = sections.end();
    const auto isBeside = [&](std::string_view other) { return !parent.empty() && pathOf(other).starts_with(parent); };
    if (const auto last = std::find_if(sections.rbegin(), sections.rend(), isBeside); last != sections.rend())
      after = last.base();
    sections.insert(after, section);
    if (end == std::string_view::npos) break;
    reference.remove_prefix(end + kHeading.size());
  }
  std::string page;
  for (const std::string_view section : sections) page.append(page.empty() ? "" : kHeading).append(section);
  return page;
}

int setupPage(std::string_view version) {
  header("mirevo-setup", 5, version, "setup file of a Mirevo run");
  fmt::print(".SH DESCRIPTION\n{}",
             "A text file that describes a run, by convention with the ending .kdx. A section is opened by\n"
             "[\\fISection\\fR] and closed by [/\\fISection\\fR]; in it are other sections, and a line\n"
             "\\fIKeyword\\fR = \\fIvalue\\fR for each setting. What follows // in a line is a comment.\n"
             "Its form, of which most is left out here:\n");
  fmt::print(".PP\n.nf\n");
  for (const std::string_view line : splitLines(kExample)) fmt::print("{}\n", plain(line));
  fmt::print(".fi\n.PP\n");
  constexpr std::size_t kCells = 6;
  bool isSection = false;
  bool isListed = false;  // the line before belongs to a list item
  bool isBegun = false;   // what is before the first list is about the page itself
  const std::string reference = reordered(setupReference());
  for (const std::string_view line : splitLines(reference)) {
    isBegun = isBegun || line.starts_with("- ");
    if (!isBegun || line.starts_with("|---") || line.starts_with("| keyword |")) continue;
    const bool wasListed = isListed;
    isListed = line.starts_with("- ") || (wasListed && line.starts_with("  "));
    if (line.starts_with("## ")) {
      if (!isSection) fmt::print(".SH SECTIONS AND KEYWORDS\n");
      isSection = true;
      fmt::print(".SS {}\n", plain(line.substr(3)));
    } else if (line.starts_with("| ")) {
      const auto cells = cellsOf(line);
      if (cells.size() != kCells) {
        fmt::print(stderr, "manual_pages: not {} cells: {}\n", kCells, line);
        return 1;
      }
      keyword(cells);
    } else if (line.starts_with("- ")) {
      fmt::print(".IP \\(bu 2\n{}\n", fromMarkdown(line.substr(2)));
    } else if (isListed) {
      fmt::print("{}\n", fromMarkdown(trim(line)));
    } else if (!line.empty()) {
      fmt::print("{}{}\n", wasListed ? ".PP\n" : "", fromMarkdown(line));
    } else if (!wasListed && isSection) {
      fmt::print(".PP\n");
    }
  }
  fmt::print(
      ".SH SEE ALSO\n.BR Mirevo (1),\n.BR mirevo\\-viewer (1),\n.BR mirevo\\-report (1),\n.BR mirevo\\-import (1)\n");
  return 0;
}

/// Where the second column of an indented line begins; npos if it has one column only.
std::size_t secondColumn(std::string_view line) {
  const std::size_t text = line.find_first_not_of(' ');
  const std::size_t gap = line.find("  ", text);
  return gap == std::string_view::npos ? gap : line.find_first_not_of(' ', gap);
}

int programPage(std::string_view version, std::string_view program, std::string_view summary, std::string_view help) {
  header(program, 1, version, summary);
  constexpr std::string_view kUsage = "Usage: ";
  std::string synopsis;
  std::string description;
  std::string paragraph = ".PP\n";  // what must come before the next text
  std::size_t column = 0;           // of the explanations in a list
  for (const std::string_view line : splitLines(help)) {
    const std::size_t indent = line.find_first_not_of(' ');
    if (indent == std::string_view::npos) {
      column = 0;
      paragraph = ".PP\n";
    } else if (line.starts_with(kUsage) || (description.empty() && indent > 0)) {
      const std::string_view usage = trim(line.starts_with(kUsage) ? line.substr(kUsage.size()) : line);
      const std::size_t end = std::min(usage.find(' '), usage.size());
      synopsis += fmt::format("{}.B {}\n{}\n", synopsis.empty() ? "" : ".br\n", plain(usage.substr(0, end)),
                              plain(trim(usage.substr(end))));
    } else if (indent == 0) {
      description += paragraph + plain(line) + "\n";
      paragraph.clear();
    } else if (column > 0 && indent >= column) {
      description += plain(trim(line)) + "\n";
    } else if (const std::size_t explanation = secondColumn(line); explanation != std::string_view::npos) {
      column = explanation;
      description += fmt::format(".TP\n\\fB{}\\fR\n{}\n", plain(trim(line.substr(0, explanation))),
                                 plain(trim(line.substr(explanation))));
    } else {
      description += fmt::format("{}.RS\n{}\n.RE\n", paragraph.empty() ? ".br\n" : paragraph, plain(trim(line)));
      paragraph = ".PP\n";
    }
  }
  if (synopsis.empty() || description.empty()) {
    fmt::print(stderr, "manual_pages: {} --help has no usage or no text\n", program);
    return 1;
  }
  fmt::print(".SH SYNOPSIS\n{}.SH DESCRIPTION\n{}.SH SEE ALSO\n", synopsis, description);
  std::string others;
  for (const std::string_view other : {"Mirevo", "mirevo-viewer", "mirevo-report", "mirevo-import"}) {
    if (other != program) others += fmt::format(".BR {} (1),\n", plain(other));
  }
  fmt::print("{}.BR mirevo\\-setup (5)\n.PP\nThe manual is in the folder {} of the installation.\n", others,
             plain("share/doc/mirevo"));
  return 0;
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  const std::vector<std::string> arguments(argv + 1, argv + argc);
  if (arguments.size() == 2 && arguments[1] == "setup") return mirevo::setupPage(arguments[0]);
  if (arguments.size() != 3) return 1;
  const std::string help{std::istreambuf_iterator<char>(std::cin), {}};
  return mirevo::programPage(arguments[0], arguments[1], arguments[2], help);
}

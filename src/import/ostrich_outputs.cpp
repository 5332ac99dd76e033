#include "import/ostrich_outputs.h"

#include <algorithm>
#include <cctype>
#include <map>
#include <utility>

#include <fmt/format.h>

#include "common/text.h"
#include "import/source_words.h"
#include "measures/instruction_file.h"

namespace mirevo {
namespace {

constexpr std::string_view kMarks = "~@#$%^|?*\"";

/// A mark that is in none of the texts.
char freeMark(std::initializer_list<std::string_view> texts, const SourcePlace& place) {
  for (const char mark : kMarks) {
    const auto lacks = [mark](std::string_view text) { return text.find(mark) == std::string_view::npos; };
    if (std::all_of(texts.begin(), texts.end(), lacks)) return mark;
  }
  failImport(place, fmt::format("expected one of the characters {} to be free as a mark, found all of them", kMarks));
}

/// What passes the columns before the one that is read, and reads it.
std::string reading(const OstrichNumber& number, std::size_t passed, char mark) {
  std::string text;
  for (std::size_t i = passed + 1; i < number.column; ++i) {
    text += number.separator == ' ' ? std::string(" !dum!") : fmt::format(" {0}{1}{0}", mark, number.separator);
  }
  return text + fmt::format(" !{}!", number.name);
}

/// Numbers of one file behind one keyword.
class OutputInstructions final {
 public:
  OutputInstructions(std::vector<OstrichNumber> numbers, const SourceFiles& files, ImportNotes& notes)
      : numbers_(std::move(numbers)), notes_(notes) {
    std::stable_sort(numbers_.begin(), numbers_.end(), [](const OstrichNumber& a, const OstrichNumber& b) {
      return std::pair(a.line, a.column) < std::pair(b.line, b.column);
    });
    const OstrichNumber& first = numbers_.front();
    mark_ = freeMark({first.keyword, ",;:/=\t "}, first.place);
    text_ = fmt::format("pif {}\n", mark_);
    if (!first.keyword.empty()) text_ += fmt::format("{0}{1}{0}", mark_, first.keyword);
    noteKeyword(files);
  }

  std::string make() {
    const bool hasKeyword = !numbers_.front().keyword.empty();
    std::size_t at = 0;  // lines of the listing that were passed: with a keyword its own is line 0
    bool isFirst = true;
    for (std::size_t i = 0; i < numbers_.size(); ++i) {
      const OstrichNumber& number = numbers_[i];
      const OstrichNumber* const before = i > 0 && numbers_[i - 1].line == number.line ? &numbers_[i - 1] : nullptr;
      if (before != nullptr) {
        readBehind(*before, number);
        continue;
      }
      const std::size_t wanted = number.line + (hasKeyword ? 0 : 1);
      if (wanted > at) {
        if (!isFirst || hasKeyword) text_ += "\n";
        text_ += fmt::format("l{}", wanted - at);
        at = wanted;
        text_ += reading(number, 0, mark_);
      } else {
        text_ += readingInKeywordsLine(number);
      }
      isFirst = false;
    }
    return text_ + "\n";
  }

 private:
  /// Further on in the same line.
  void readBehind(const OstrichNumber& before, const OstrichNumber& number) {
    if (number.separator != before.separator || number.column == before.column) {
      failImport(number.place,
                 fmt::format("expected another column and the same separator as {}, which is read from the "
                             "same line of {}: let the model write the number twice",
                             before.name, number.file));
    }
    // Behind a number only the next separator is passed, of columns between two each one.
    const std::size_t passed = number.separator == ' ' ? before.column : before.column - 1;
    text_ += reading({number.name, "", "", 0, number.column, number.separator, {}}, passed, mark_);
  }

  /// The columns of the keyword's own line count from the keyword on.
  std::string readingInKeywordsLine(const OstrichNumber& number) const {
    const std::size_t words =
        number.separator == ' '
            ? wordsOf(number.keyword).size()
            : static_cast<std::size_t>(std::count(number.keyword.begin(), number.keyword.end(), number.separator));
    if (number.separator == ' ' && number.column <= words) {
      failImport(number.place, fmt::format("expected a column behind the keyword {}, of {}, found {}",
                                           quotedForMessage(number.keyword), countText(words, "word"), number.column));
    }
    return reading(number, words, mark_);
  }

  /// Whether columns count from the keyword or from the beginning of its line makes no difference only if it is there.
  void noteKeyword(const SourceFiles& files) {
    const OstrichNumber& first = numbers_.front();
    if (first.keyword.empty() || first.line > 0) return;
    bool isAtBeginning = false;
    if (files.exists(first.file)) {
      const std::string content = files.read(first.file, first.place);
      for (const std::string_view line : splitLines(content)) {
        if (line.find(first.keyword) == std::string_view::npos) continue;
        isAtBeginning = trim(line).starts_with(first.keyword);
        break;
      }
    }
    if (isAtBeginning) return;
    notes_.add(NoteKind::toCheck, first.place,
               fmt::format("columns in the line of the keyword {} are counted from the keyword on",
                           quotedForMessage(first.keyword)));
  }
  std::vector<OstrichNumber> numbers_;
  ImportNotes& notes_;
  char mark_ = '~';
  std::string text_;
};

/// What the instructions find in the output that is in the folder, if there is one.
void noteFound(const std::string& instructionFile, const std::string& instructions, const OstrichNumber& first,
               const SourceFiles& files, ImportNotes& notes) {
  std::string reason;
  const auto parsed = InstructionFile::parse(instructionFile, instructions, reason);
  if (!parsed) failImport(first.place, reason);
  if (!files.exists(first.file)) {
    notes.add(NoteKind::toCheck, first.place,
              fmt::format("{} is made of this and could not be tried, as there is no {}", instructionFile, first.file));
    return;
  }
  const auto values = parsed->read(first.file, files.read(first.file, first.place), reason);
  if (!values) {
    notes.add(NoteKind::toCheck, first.place,
              fmt::format("{} does not read the {} that is here: {}", instructionFile, first.file, reason));
    return;
  }
  std::string found;
  for (std::size_t i = 0; i < values->size(); ++i) {
    found += fmt::format("{}{} = {}", i == 0 ? "" : ", ", parsed->names()[i], formatReal((*values)[i]));
  }
  notes.add(NoteKind::toCheck, first.place,
            fmt::format("{} reads in the {} that is here: {}", instructionFile, first.file, found));
}

bool isOfName(char c) {
  return std::isalnum(static_cast<unsigned char>(c)) != 0 || c == '_';
}

}  // namespace

void addInstructions(std::vector<OstrichNumber> numbers, const SourceFiles& files, ImportedCase& imported) {
  std::vector<std::pair<std::pair<std::string, std::string>, std::vector<OstrichNumber>>> groups;
  for (OstrichNumber& number : numbers) {
    const std::pair key(number.file, number.keyword);
    auto group = std::find_if(groups.begin(), groups.end(), [&](const auto& one) { return one.first == key; });
    if (group == groups.end()) group = groups.insert(groups.end(), {key, {}});
    group->second.push_back(std::move(number));
  }
  std::size_t count = 0;
  for (auto& [key, group] : groups) {
    const std::string name = fmt::format("mirevo_{}.ins", ++count);
    const OstrichNumber first = group.front();
    const std::string text = OutputInstructions(std::move(group), files, imported.notes).make();
    noteFound(name, text, first, files, imported.notes);
    imported.newFiles.emplace(name, text);
    imported.outputs.push_back({first.file, name, first.place});
  }
}

std::string markedTemplate(const std::string& name, std::string_view text, const std::vector<std::string>& parameters,
                           int digits, ImportNotes& notes) {
  const char mark = freeMark({text}, {name, 0});
  constexpr int kBesideDigits = 7;  // sign, point, exponent
  std::vector<std::string> longestFirst = parameters;
  std::stable_sort(longestFirst.begin(), longestFirst.end(),
                   [](const std::string& a, const std::string& b) { return a.size() > b.size(); });
  std::string made = fmt::format("ptf {}\n", mark);
  SourcePlace place{name, 0};
  for (const std::string_view line : splitLines(text)) {
    ++place.line;
    for (std::size_t at = 0; at < line.size();) {
      const auto found = std::find_if(longestFirst.begin(), longestFirst.end(), [&](const std::string& parameter) {
        return !parameter.empty() && line.substr(at).starts_with(parameter);
      });
      if (found == longestFirst.end()) {
        made += line[at++];
        continue;
      }
      const std::size_t end = at + found->size();
      if ((at > 0 && isOfName(line[at - 1])) || (end < line.size() && isOfName(line[end]))) {
        notes.add(NoteKind::toCheck, place,
                  fmt::format("{} is a part of a word here and replaced all the same, as it was", *found));
      }
      made += fmt::format("{}{:{}}{}", mark, *found, std::max<std::size_t>(found->size(), digits + kBesideDigits - 2),
                          mark);
      at = end;
    }
    made += '\n';
  }
  return made;
}

}  // namespace mirevo

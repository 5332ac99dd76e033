#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "import/imported_case.h"
#include "import/source_files.h"

namespace mirevo {

/// Where Ostrich finds a number: `line` lines behind the first line with the keyword (behind the first line of the file
/// for OST_NULL), in a column of words.
struct OstrichNumber {
  std::string name;
  std::string file;
  std::string keyword;  ///< empty for OST_NULL
  std::size_t line = 0;
  std::size_t column = 1;  ///< from 1
  char separator = ' ';
  SourcePlace place;
};

/// Makes instruction files that read the numbers: one per file and keyword, since Ostrich looks for each keyword from
/// the beginning of the file. Notes what must be looked at.
void addInstructions(std::vector<OstrichNumber> numbers, const SourceFiles& files, ImportedCase& imported);

/// A template of Ostrich, which has the parameters' names themselves, as one with marks around fields for values of
/// `digits` digits. Notes names that may be parts of words.
std::string markedTemplate(const std::string& name, std::string_view text, const std::vector<std::string>& parameters,
                           int digits, ImportNotes& notes);

}  // namespace mirevo

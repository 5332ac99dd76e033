#pragma once

#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "import/case_folder.h"
#include "import/import_sources.h"
#include "import/ostrich_case.h"
#include "import/pest_case.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo::testing {

using Edits = std::vector<std::pair<std::string, std::string>>;

/// `text` with the first occurrence of each first text replaced by the second one; each must be there.
inline std::string edited(std::string text, const Edits& edits) {
  for (const auto& [from, to] : edits) {
    const std::size_t at = text.find(from);
    EXPECT_NE(at, std::string::npos) << from;
    if (at != std::string::npos) text.replace(at, from.size(), to);
  }
  return text;
}

/// A folder with sources, and what becomes of them.
class ImportTest : public ::testing::Test {
 protected:
  ImportedCase importPest(const std::string& text) {
    writePestModel(folder_, "src");
    ImportedCase made = importPestControl("case.pst", text, SourceFiles(folder_ / "src"));
    made.name = "case";
    checkCase(made);
    return made;
  }
  ImportedCase importOstrich(const std::string& text) {
    writeOstrichModel(folder_, "src");
    ImportedCase made = importOstrichInput("ostIn.txt", text, SourceFiles(folder_ / "src"));
    made.name = "ostIn";
    checkCase(made);
    return made;
  }
  std::string refusalOfPest(const Edits& edits) {
    return refusalOf([&] { importPest(edited(kPestCase, edits)); });
  }
  std::string refusalOfOstrich(const Edits& edits) {
    return refusalOf([&] { importOstrich(edited(kOstrichCase, edits)); });
  }

  TemporaryFolder folder_;
};

}  // namespace mirevo::testing

#include "common/replaceable_files.h"

#include <gtest/gtest.h>

#include "common/run_files.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

/// As a full disk leaves them. Of the page what the program is built with.
TEST(ReplaceableFiles, CutOffAtAnyByteAreARunsAndOthersAreNot) {
  const TemporaryFolder folder;
  const std::string page = TemporaryFolder::readFile(MIREVO_SOURCE_DIR "/src/report/page/report.html");
  ASSERT_GT(page.size(), 300U);
  for (const auto& [whole, file] : {std::pair{std::string("Mirevo 1.2, started"), run_files::kLog},
                                    {"1v0veriM....", run_files::kOptimisation.simulatedValues},
                                    {"2v0veriM....", run_files::kPlain.simulatedValues},
                                    {page.substr(0, 300), run_files::kReport},
                                    {"# Title\n# Mirevo 1.2\n", run_files::kPlain.results}}) {
    for (std::size_t length = 0; length <= whole.size(); ++length) {
      const std::string path = folder.write("x", whole.substr(0, length));
      EXPECT_EQ(whyNotReplaceable(path, file), "") << whole.substr(0, length);
    }
    for (const char* other : {"my", "<!doctype html>\n<html>", "1.5 2.5\n", "Mirror", "# my\n# own\n"}) {
      EXPECT_NE(whyNotReplaceable(folder.write("x", other), file), "") << other;
    }
  }
}

}  // namespace
}  // namespace mirevo

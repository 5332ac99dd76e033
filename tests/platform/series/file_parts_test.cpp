#include "platform/series/file_parts.h"

#include <string>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

TEST(FileParts, LinesAreWholeAcrossParts) {
  const std::string longLine(3'000'000, 'x');
  const std::tuple<std::string, std::vector<std::string>, bool> cases[] = {
      {"", {}, true},
      {"\n\na", {"", "", "a"}, false},
      {"a\r\nb\r\n", {"a", "b"}, true},
      {"a\r\nb\r", {"a", "b"}, true},
      {longLine + "\nb\n" + longLine, {longLine, "b", longLine}, false},
  };
  const TemporaryFolder folder;
  for (const auto& [content, lines, endsLine] : cases) {
    const std::string path = folder.write("f.txt", content);
    FileParts file(path, nullptr);
    FileParts text{std::string_view(content)};
    for (FileParts* parts : {&file, &text}) {
      std::vector<std::string> read;
      while (const auto line = parts->nextLine()) read.emplace_back(*line);
      EXPECT_EQ(read, lines);
      EXPECT_EQ(parts->endsLine(), endsLine);
      EXPECT_EQ(parts->fault(), "");
    }
  }
  FileParts none(folder / "none", nullptr);
  EXPECT_FALSE(none.nextLine().has_value());
  EXPECT_EQ(none.fault(), "No such file or directory");
  FileParts tooLong(folder.write("f.txt", std::string(70'000'000, 'x')), nullptr);
  EXPECT_FALSE(tooLong.nextLine().has_value());
  EXPECT_EQ(tooLong.fault(), "it has a line of more than 67108864 bytes");
}

}  // namespace
}  // namespace mirevo

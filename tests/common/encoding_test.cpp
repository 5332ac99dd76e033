#include "common/encoding.h"

#include <tuple>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

using std::string_literals::operator""s;

TEST(Encoding, TextIsReadAsWhatItIs) {
  const std::tuple<std::string, std::string, const char*> cases[] = {
      {"", "", "UTF-8"},
      {"\xEF\xBB\xBFö", "\xEF\xBB\xBFö", "UTF-8"},
      {"gr\xF6\xDF"
       "er \x80 \x81",
       "größer € \xC2\x81", "Latin-1"},
      {"\xFF\xFE[\0\xF6\0=\xD8\0\xDE"s, "\xEF\xBB\xBF[ö😀", "UTF-16"},
      {"\xFE\xFF\0[\x20\xAC"s, "\xEF\xBB\xBF[€", "UTF-16"},
      {"[\0a\0"s, "[a", "UTF-16"},
      {"\0[\xD8\0\0a\0"s,
       "[\xEF\xBF\xBD"
       "a",
       "UTF-16"},
  };
  for (const auto& [bytes, text, encoding] : cases) {
    const DecodedText decoded = decodeText(bytes);
    EXPECT_EQ(decoded.text, text);
    EXPECT_EQ(decoded.encoding, encoding) << text;
  }
}

}  // namespace
}  // namespace mirevo

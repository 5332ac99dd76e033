#pragma once

#include <concepts>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Writes one JSON value that is safe inside an HTML script element: in texts `<`, `>`, `&` and the line separators of
/// JavaScript are escaped, and bytes that are not UTF-8 are replaced by U+FFFD. Numbers that are not finite become
/// null. The caller opens and closes objects and arrays in pairs; commas are added automatically.
class JsonWriter final {
 public:
  /// Significant digits: for tables, and for values that are only drawn.
  enum class Digits { table = 10, drawn = 7 };

  JsonWriter& beginObject() { return open('{'); }
  JsonWriter& endObject() { return close('}'); }
  JsonWriter& beginArray() { return open('['); }
  JsonWriter& endArray() { return close(']'); }
  /// The name of a member; its value must follow.
  JsonWriter& key(std::string_view name);

  JsonWriter& text(std::string_view value);
  JsonWriter& number(double value, Digits digits = Digits::table);
  JsonWriter& integer(std::int64_t value);
  JsonWriter& boolean(bool value);
  JsonWriter& null();

  JsonWriter& member(std::string_view name, std::string_view value) { return key(name).text(value); }
  JsonWriter& member(std::string_view name, const char* value) { return key(name).text(value); }
  JsonWriter& member(std::string_view name, double value) { return key(name).number(value); }
  JsonWriter& member(std::string_view name, std::same_as<bool> auto value) { return key(name).boolean(value); }
  template <std::integral Integer>
  requires(!std::same_as<Integer, bool>) JsonWriter& member(std::string_view name, Integer value) {
    return key(name).integer(static_cast<std::int64_t>(value));
  }
  JsonWriter& member(std::string_view name, std::span<const std::string> values);
  /// A text; null if it is empty.
  JsonWriter& optionalMember(std::string_view name, std::string_view value);

  template <class Number>
  JsonWriter& numbers(const std::vector<Number>& values, Digits digits) {
    beginArray();
    for (const Number value : values) number(value, digits);
    return endArray();
  }
  template <class Number>
  JsonWriter& rows(const std::vector<std::vector<Number>>& values, Digits digits) {
    beginArray();
    for (const auto& row : values) numbers(row, digits);
    return endArray();
  }

  std::string take() { return std::move(text_); }

 private:
  JsonWriter& open(char bracket);
  JsonWriter& close(char bracket);
  void separate();

  std::string text_;
  bool needsComma_ = false;
};

}  // namespace mirevo

#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <type_traits>

namespace mirevo {

/// Bytes of a binary file, one number after the other, little-endian.
class Bytes {
 public:
  Bytes& ints(std::initializer_list<std::int32_t> numbers) { return all(numbers); }
  Bytes& floats(std::initializer_list<float> numbers) { return all(numbers); }
  Bytes& doubles(std::initializer_list<double> numbers) { return all(numbers); }
  Bytes& text(std::string_view text) {
    content += text;
    return *this;
  }
  /// Text in a field of fixed width.
  Bytes& field(std::string_view text, std::size_t width, char padding = '\0') {
    content += text;
    content.append(width - text.size(), padding);
    return *this;
  }
  template <typename Number>
  static std::string of(Number number) {
    return {reinterpret_cast<const char*>(&number), sizeof number};
  }
  /// `content` with a number in the place of that at a byte.
  static std::string with(std::string content, std::size_t place, std::int32_t number) {
    return content.replace(place, sizeof number, of(number));
  }

  std::string content;

 private:
  template <typename Number>
  Bytes& all(std::initializer_list<Number> numbers) {
    for (const Number number : numbers) content += of(number);
    return *this;
  }
};

}  // namespace mirevo

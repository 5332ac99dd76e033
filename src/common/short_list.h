#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace mirevo {

/// The items of a sentence, as many as a reader wants to see: "a, b and 7 more".
class ShortList final {
 public:
  /// `most`: how many are named.
  explicit ShortList(std::size_t most) : most_(most) {}

  void add(std::string_view item);
  std::size_t count() const { return count_; }
  bool isEmpty() const { return count_ == 0; }
  std::string text() const;

 private:
  std::size_t most_;
  std::size_t count_ = 0;
  std::string named_;
};

}  // namespace mirevo

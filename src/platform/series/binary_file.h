#pragma once

#include <cstdint>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "common/descriptor.h"

namespace mirevo {

struct SeriesReading;

/// A file of numbers as processors with little-endian words store them, read at the places that are asked for: no more
/// than these are in memory, however large it is.
class BinaryFile final {
 public:
  explicit BinaryFile(std::shared_ptr<SeriesReading> reading = nullptr) : reading_(std::move(reading)) {}

  /// False, with fault(), when it cannot be opened.
  bool open(const std::string& path);
  void close();
  const std::string& path() const { return path_; }
  std::uint64_t size() const { return size_; }
  const std::string& fault() const { return fault_; }

  /// `length` bytes from a place on; false, with fault(), where the file does not have them.
  bool read(std::uint64_t place, void* bytes, std::size_t length);
  template <typename Number>
  std::optional<Number> number(std::uint64_t place) {
    static_assert(std::is_trivially_copyable_v<Number>);
    Number value;
    return read(place, &value, sizeof value) ? std::optional(value) : std::nullopt;
  }
  /// A real number of 8 or 4 bytes.
  std::optional<double> real(std::uint64_t place, std::uint64_t width) {
    if (width == sizeof(double)) return number<double>(place);
    const auto value = number<float>(place);
    return value ? std::optional<double>(*value) : std::nullopt;
  }
  std::optional<std::string> text(std::uint64_t place, std::size_t length);
  template <typename Number>
  std::optional<std::vector<Number>> numbers(std::uint64_t place, std::size_t count) {
    if (count > size_ / sizeof(Number)) return endsAt<std::vector<Number>>();
    std::vector<Number> values(count);
    return read(place, values.data(), count * sizeof(Number)) ? std::optional(std::move(values)) : std::nullopt;
  }
  /// One number of each of `count` records that are `stride` bytes apart, the first of them at `place`.
  template <typename Number>
  std::optional<std::vector<Number>> column(std::uint64_t place, std::uint64_t stride, std::size_t count) {
    if (count > size_ / sizeof(Number)) return endsAt<std::vector<Number>>();
    std::vector<Number> values(count);
    if (!readColumn(place, stride, count, sizeof(Number), reinterpret_cast<char*>(values.data()))) return std::nullopt;
    return values;
  }

 private:
  bool readColumn(std::uint64_t place, std::uint64_t stride, std::size_t count, std::size_t width, char* values);
  template <typename Result>
  std::optional<Result> endsAt() {
    refuseEnd();
    return std::nullopt;
  }
  void refuseEnd();

  std::shared_ptr<SeriesReading> reading_;
  std::string path_;
  std::unique_ptr<Descriptor> file_;
  std::uint64_t size_ = 0;
  std::string fault_;
};

/// Whether the bytes, the first ones of a file, begin with this number.
inline bool beginsWith(std::string_view head, std::int32_t number) {
  std::int32_t first = 0;
  if (head.size() < sizeof first) return false;
  std::memcpy(&first, head.data(), sizeof first);
  return first == number;
}

}  // namespace mirevo

#include "platform/series/netcdf_classic.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <fstream>
#include <limits>
#include <vector>

#include <fmt/core.h>

namespace mirevo {
namespace {

constexpr std::uint64_t kDimensions = 10;
constexpr std::uint64_t kVariables = 11;
constexpr std::uint64_t kAttributes = 12;

/// Reads the header of a file in a classic format, whose numbers are big-endian. Sizes are doubles: exact for every
/// possible file, and without overflow for a damaged header.
class ClassicHeader final {
 public:
  explicit ClassicHeader(const std::string& fileName) : file_(fileName, std::ios::binary) {}

  /// The least number of bytes that the file must have: infinite if it has fewer than its header, whose counts the
  /// library takes for granted; empty if it cannot be determined.
  std::optional<double> smallestSize() {
    if (number(3) != 0x434446) return std::nullopt;  // "CDF"
    const std::uint64_t version = number(1);
    if (version != 1 && version != 2 && version != 5) return std::nullopt;
    countBytes_ = version == 5 ? 8 : 4;
    offsetBytes_ = version == 1 ? 4 : 8;
    const std::uint64_t records = number(countBytes_);
    const bool isStreamed = records == (version == 5 ? ~std::uint64_t{0} : std::uint64_t{0xFFFFFFFF});
    for (std::uint64_t left = listLength(kDimensions); left > 0 && file_; --left) {
      skipText();
      lengths_.push_back(static_cast<double>(number(countBytes_)));
    }
    skipAttributes();
    for (std::uint64_t left = listLength(kVariables); left > 0 && file_; --left) readVariable();
    if (!file_) return std::numeric_limits<double>::infinity();
    if (isStreamed) return std::nullopt;
    return endOfData(static_cast<double>(records));
  }

 private:
  struct Variable {
    double bytes;  ///< of one record, or of the whole variable if it has none
    double begin;
    bool isRecord;
  };

  std::uint64_t number(int bytes) {
    std::uint64_t value = 0;
    for (int i = 0; i < bytes; ++i) value = value << 8U | (static_cast<std::uint64_t>(file_.get()) & 0xFFU);
    return value;
  }
  /// Number of elements of a list; an absent list is marked by two zeros.
  std::uint64_t listLength(std::uint64_t tag) {
    const bool isThere = number(4) == tag;
    const std::uint64_t length = number(countBytes_);
    return isThere ? length : 0;
  }
  void skip(double bytes) {
    if (bytes < 1e15) file_.seekg(static_cast<std::streamoff>(std::ceil(bytes / 4.0) * 4.0), std::ios::cur);
    if (bytes >= 1e15) file_.setstate(std::ios::failbit);
  }
  void skipText() { skip(static_cast<double>(number(countBytes_))); }
  void skipAttributes() {
    for (std::uint64_t left = listLength(kAttributes); left > 0 && file_; --left) {
      skipText();
      const double size = typeSize();
      skip(size * static_cast<double>(number(countBytes_)));
    }
  }
  double typeSize() {
    constexpr double kSizes[] = {0, 1, 1, 2, 4, 4, 8, 1, 2, 4, 8, 8};
    const std::uint64_t type = number(4);
    return type < std::size(kSizes) ? kSizes[type] : 0.0;
  }
  void readVariable() {
    Variable variable{1.0, 0.0, false};
    skipText();
    for (std::uint64_t left = number(countBytes_), first = left; left > 0 && file_; --left) {
      const std::uint64_t dimension = number(countBytes_);
      const double length = dimension < lengths_.size() ? lengths_[dimension] : 0.0;
      if (left == first && length == 0.0) {  // the unlimited dimension, which only comes first
        variable.isRecord = true;
      } else {
        variable.bytes *= length;
      }
    }
    skipAttributes();
    variable.bytes *= typeSize();
    number(countBytes_);  // its size according to the header, which is wrong for large variables
    variable.begin = static_cast<double>(number(offsetBytes_));
    variables_.push_back(variable);
  }
  double endOfData(double records) const {
    const auto recordVariables =
        std::count_if(variables_.begin(), variables_.end(), [](const Variable& v) { return v.isRecord; });
    double recordSize = 0.0;
    for (const Variable& v : variables_) {
      if (v.isRecord) recordSize += recordVariables == 1 ? v.bytes : std::ceil(v.bytes / 4.0) * 4.0;
    }
    double end = 0.0;
    for (const Variable& v : variables_) {
      if (v.isRecord && records < 1.0) continue;
      end = std::max(end, v.begin + v.bytes + (v.isRecord ? (records - 1.0) * recordSize : 0.0));
    }
    return end;
  }

  std::ifstream file_;
  int countBytes_ = 4;
  int offsetBytes_ = 4;
  std::vector<double> lengths_;  ///< of the dimensions; 0 for the unlimited one
  std::vector<Variable> variables_;
};

}  // namespace

std::optional<std::string> findCutOff(const std::string& fileName) {
  const std::optional<double> expected = ClassicHeader(fileName).smallestSize();
  if (!expected) return std::nullopt;
  if (std::isinf(*expected)) return "it ends within its header: it was not written to its end, or is damaged";
  std::ifstream file(fileName, std::ios::binary | std::ios::ate);
  const auto size = static_cast<double>(file.tellg());
  if (!file || size >= *expected) return std::nullopt;
  return fmt::format("expected {:.0f} bytes as its header says, found {:.0f}: it was not written to its end", *expected,
                     size);
}

}  // namespace mirevo

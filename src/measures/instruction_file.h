#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

class ReadingWatch;

/// An instruction file: where in a listing that a model writes the numbers are. The language is that of PEST (Doherty,
/// PEST User Manual, chapter "Instruction files"), so that files that exist can be used as they are:
///
///     pif ~              the delimiter of markers
///     ~Outflow~ ~m3/s~   on to the next line with the first text (primary marker) and, behind it, the second one
///     l2 w !flow1!       two lines on; behind the next blanks; a number from there on
///     &  t20 (flow2)21:30 [flow3]41:50   the same line; on column 20; a number that touches these columns; one in them
///
/// `dum` in the place of a name reads something and leaves it.
class InstructionFile final {
 public:
  /// Empty, with place and cause in `reason`, for a text that is none.
  static std::optional<InstructionFile> parse(const std::string& sourceName, std::string_view text,
                                              std::string& reason);

  /// Of the numbers, in the order in which they are read; without `dum`. Case is kept, and does not distinguish them.
  const std::vector<std::string>& names() const { return names_; }
  /// The 0-based place of a name, whatever its case.
  std::optional<std::size_t> placeOf(std::string_view name) const;

  /// One number per name from a listing; empty, with the place in the listing and that of the instruction in `reason`,
  /// where it is not as the instructions say. `watch` may be null. Columns that cut a number in two, unless others go
  /// on with it, are what the instructions say, but hardly what they mean: `doubts` (may be null) gets a line of them.
  std::optional<std::vector<double>> read(const std::string& sourceName, std::string_view content, std::string& reason,
                                          ReadingWatch* watch = nullptr,
                                          std::vector<std::string>* doubts = nullptr) const;

  struct Instruction {
    enum class Kind { primaryMarker, lines, secondaryMarker, whitespace, tab, inColumns, touchingColumns, nextNumber };
    Kind kind = Kind::lines;
    std::string text = {};                 ///< of a marker
    std::size_t first = 0;                 ///< lines, the column of a tab, or the first column of a number; from 1
    std::size_t last = 0;                  ///< its last column
    std::optional<std::size_t> name = {};  ///< place of what is read; nothing for `dum`
    std::size_t line = 0;                  ///< where it stands, from 1
    std::size_t column = 0;

    bool readsNumber() const { return kind >= Kind::inColumns; }
    bool isMarker() const { return kind == Kind::primaryMarker || kind == Kind::secondaryMarker; }
  };

 private:
  std::string sourceName_;
  std::vector<std::string> names_;
  /// Each begins with a primary marker or with a number of lines; lines that go on with `&` are one.
  std::vector<std::vector<Instruction>> lines_;

  friend class InstructionParser;
};

}  // namespace mirevo

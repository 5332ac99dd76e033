#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/series/text_form.h"

namespace mirevo {

/// The lines of a text file as its form says what they are, one after another.
class TextLayout final {
 public:
  enum class Kind {
    outside,  ///< of the table
    title,
    skipped,
    comment,
    blank,
    header,
    row
  };
  struct Line {
    std::string_view text;  ///< without its end
    std::size_t number = 0;
    Kind kind = Kind::outside;
  };

  /// `content` and `form` must outlive the object.
  TextLayout(std::string_view content, const TextForm& form);

  /// Takes the next line; false at the end of the content.
  bool next(Line& line);
  /// Puts the cells of a header line or of a row into `cells`, without blanks and quotes around them. The first line of
  /// a file without a stated separator tells it: it is the first tab, semicolon or comma in it, which is not the
  /// decimal sign; false if it has none.
  bool split(std::string_view line, std::vector<std::string_view>& cells);
  /// The same for a text behind the last column of fixed width, which belongs to none.
  std::string_view behindColumns(std::string_view line) const;
  /// Where columns of fixed width cut a number: the 0-based column that has its first part.
  struct Cut {
    std::size_t column = 0;
    std::size_t character = 0;  ///< of the line, the first one of the next column, from 1
  };
  /// The first cut behind column `first` or one after it.
  std::optional<Cut> findCut(std::string_view line, std::size_t first) const;

  /// Numbers of the lines that have the title of the table, so far; of a table with a number, how many began.
  const std::vector<std::size_t>& titleLines() const { return titleLines_; }
  std::size_t tableCount() const { return tableCount_; }
  /// For people: "tab", "';'", "blanks", "fixed widths"; empty as long as it is not known.
  std::string separatorName() const;
  char separator() const { return separator_; }

 private:
  enum class State { before, skipping, header, rows, behind };

  Kind kindOf(std::string_view line);
  bool isComment(std::string_view text) const;
  /// Whether the table begins with this line, or behind it if it is its title.
  bool beginsTable(std::string_view text);
  std::size_t widthInBytes(std::string_view line, std::size_t begin, std::size_t characters) const;
  bool findSeparator(std::string_view line);

  std::string_view rest_;
  const TextForm& form_;
  std::size_t number_ = 0;
  State state_ = State::skipping;
  std::int32_t left_ = 0;   ///< lines to skip, or header rows
  std::size_t wanted_ = 0;  ///< number of the table; 0: it has a title, or there is one
  bool isInBlock_ = false;  ///< of lines without a blank one
  bool hasRows_ = false;
  std::size_t tableCount_ = 0;
  std::vector<std::size_t> titleLines_;
  char separator_ = '\0';
  bool isUtf8_ = true;
};

/// The first lines of a file as they are understood, each on a line of its own behind a line that says so, for a
/// refusal: what they are, and the cells with `|` between them. Long ones are cut, what is not printable is shown as
/// `\x09`.
std::string describeFirstLines(std::string_view content, const TextForm& form);

}  // namespace mirevo

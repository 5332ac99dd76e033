// The text files of the example models: parameters in lines `name = value`, daily series as CSV. Every error message
// begins with the name and line of the file.
#pragma once

#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace models {

/// Throws a std::runtime_error.
[[noreturn]] void fail(const std::string& message);

/// The content of a file that must not be empty.
std::string readFile(const std::string& name);

/// Writes a temporary file and renames it to `name`, so that nobody ever reads half of it.
void writeFile(const std::string& name, const std::string& content);

/// Appends a comma and the number with seven significant digits, the resolution of single precision.
void appendNumber(std::string& text, double value);

/// The lines `name = value` of a parameter file; `#` begins a comment. Values are taken out one by one; names that are
/// left over are unknown.
class ParameterFile {
 public:
  explicit ParameterFile(const std::string& name);

  /// Takes out a number, which must be in lowest..highest.
  double number(const std::string& key, double lowest, double highest);
  /// Takes out a date such as 2001-01-31, as text; `otherwise` if there is none.
  std::string date(const std::string& key, const std::string& otherwise);
  void checkAllTaken() const;

 private:
  struct Value {
    std::string text;
    std::string place;
  };
  std::string name_;
  std::map<std::string, Value> values_;
};

/// A CSV file, row by row: `#` lines, a header row, then the rows. Columns are identified by their names, in any order.
class CsvFile {
 public:
  explicit CsvFile(const std::string& name);
  CsvFile(const CsvFile&) = delete;  // cells_ points into content_
  CsvFile& operator=(const CsvFile&) = delete;

  bool hasColumn(std::string_view column) const;
  /// The index of a column; throws if there is none with this name.
  std::size_t column(std::string_view column) const;

  /// Goes to the next row that is not blank; false at the end.
  bool nextRow();
  std::string_view text(std::size_t column) const;
  double number(std::size_t column) const;
  /// The file's name and the line of the row.
  std::string place() const;

 private:
  std::string name_;
  std::string content_;
  std::vector<std::string> header_;
  std::size_t position_ = 0;  ///< of the next line in content_
  int lineNumber_ = 0;
  std::vector<std::string_view> cells_;
};

}  // namespace models

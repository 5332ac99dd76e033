#include "models/model_files.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <system_error>

namespace models {
namespace {

std::string_view trimmed(std::string_view text) {
  constexpr std::string_view kBlanks = " \t\r";
  const auto first = text.find_first_not_of(kBlanks);
  return first == std::string_view::npos ? "" : text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

/// The line of `content` that begins at `position`, without its end; `position` moves on to the next.
std::string_view takeLine(std::string_view content, std::size_t& position) {
  const auto end = std::min(content.find('\n', position), content.size());
  const std::string_view line = content.substr(position, end - position);
  position = std::min(end + 1, content.size());
  return line;
}

std::vector<std::string_view> splitAtCommas(std::string_view line) {
  std::vector<std::string_view> cells;
  for (;;) {
    const auto comma = line.find(',');
    cells.push_back(trimmed(line.substr(0, comma)));
    if (comma == std::string_view::npos) return cells;
    line.remove_prefix(comma + 1);
  }
}

double toNumber(std::string_view text, const std::string& place) {
  double value = 0.0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size() || !std::isfinite(value)) {
    fail(place + ": expected a number, found '" + std::string(text) + "'");
  }
  return value;
}

}  // namespace

void fail(const std::string& message) {
  throw std::runtime_error(message);
}

std::string readFile(const std::string& name) {
  std::ifstream file(name, std::ios::binary);
  std::string content{std::istreambuf_iterator<char>(file), {}};
  if (!file || content.empty()) fail(name + ": cannot be read, or is empty");
  return content;
}

void writeFile(const std::string& name, const std::string& content) {
  const std::string temporary = name + ".part";
  std::ofstream file(temporary, std::ios::binary | std::ios::trunc);
  file.write(content.data(), static_cast<std::streamsize>(content.size()));
  file.close();
  if (!file || std::rename(temporary.c_str(), name.c_str()) != 0) {
    std::remove(temporary.c_str());
    fail(name + ": cannot be written");
  }
}

void appendNumber(std::string& text, double value) {
  std::array<char, 32> buffer{};
  const auto end = std::to_chars(buffer.data(), buffer.data() + buffer.size(), value, std::chars_format::general, 7);
  text += ',';
  text.append(buffer.data(), end.ptr);
}

ParameterFile::ParameterFile(const std::string& name) : name_(name) {
  const std::string content = readFile(name);
  std::size_t position = 0;
  for (int line = 1; position < content.size(); ++line) {
    std::string_view text = takeLine(content, position);
    text = trimmed(text.substr(0, text.find('#')));
    if (text.empty()) continue;
    const auto equals = text.find('=');
    const std::string place = name + ":" + std::to_string(line);
    if (equals == std::string_view::npos) fail(place + ": expected 'name = value'");
    const std::string key(trimmed(text.substr(0, equals)));
    if (!values_.emplace(key, Value{std::string(trimmed(text.substr(equals + 1))), place}).second) {
      fail(place + ": '" + key + "' is given a second time");
    }
  }
}

double ParameterFile::number(const std::string& key, double lowest, double highest) {
  const auto found = values_.find(key);
  if (found == values_.end()) fail(name_ + ": '" + key + "' is missing");
  const double value = toNumber(found->second.text, found->second.place);
  if (value < lowest || value > highest) fail(found->second.place + ": '" + key + "' is out of its range");
  values_.erase(found);
  return value;
}

std::string ParameterFile::date(const std::string& key, const std::string& otherwise) {
  const auto found = values_.find(key);
  if (found == values_.end()) return otherwise;
  if (found->second.text.size() != 10) fail(found->second.place + ": expected a date such as 2001-01-31");
  std::string text = found->second.text;
  values_.erase(found);
  return text;
}

void ParameterFile::checkAllTaken() const {
  if (!values_.empty()) fail(values_.begin()->second.place + ": unknown name '" + values_.begin()->first + "'");
}

CsvFile::CsvFile(const std::string& name) : name_(name), content_(readFile(name)) {
  std::string_view line;
  do {
    line = takeLine(content_, position_);
    ++lineNumber_;
  } while (position_ < content_.size() && line.starts_with('#'));
  for (const std::string_view column : splitAtCommas(line)) header_.emplace_back(column);
}

bool CsvFile::hasColumn(std::string_view column) const {
  return std::find(header_.begin(), header_.end(), column) != header_.end();
}

std::size_t CsvFile::column(std::string_view column) const {
  const auto found = std::find(header_.begin(), header_.end(), column);
  if (found == header_.end()) fail(place() + ": no column '" + std::string(column) + "'");
  return static_cast<std::size_t>(found - header_.begin());
}

bool CsvFile::nextRow() {
  while (position_ < content_.size()) {
    const std::string_view line = takeLine(content_, position_);
    ++lineNumber_;
    if (trimmed(line).empty()) continue;
    cells_ = splitAtCommas(line);
    return true;
  }
  return false;
}

std::string_view CsvFile::text(std::size_t column) const {
  if (column >= cells_.size()) fail(place() + ": the row is cut short");
  return cells_[column];
}

double CsvFile::number(std::size_t column) const {
  return toNumber(text(column), place());
}

std::string CsvFile::place() const {
  return name_ + ":" + std::to_string(lineNumber_);
}

}  // namespace models

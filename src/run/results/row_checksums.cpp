#include "run/results/row_checksums.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <optional>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/data_table.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kDigits = 16;

const std::vector<std::string>& columns() {
  static const std::vector<std::string> kColumns{"Evaluation", "Checksum"};
  return kColumns;
}

/// All digits must be there: a cell that is cut off is no checksum.
std::optional<std::uint64_t> readChecksum(std::string_view cell) {
  std::uint64_t checksum = 0;
  const auto [end, error] = std::from_chars(cell.data(), cell.data() + cell.size(), checksum, 16);
  if (cell.size() != kDigits || error != std::errc() || end != cell.data() + cell.size()) return std::nullopt;
  return checksum;
}

bool isBefore(const RowChecksum& a, const RowChecksum& b) {
  return a.number < b.number;
}

/// Up to the end of the header row; of a text without one, all.
std::size_t headLength(std::string_view text) {
  for (std::size_t begin = 0, end = 0; (end = text.find('\n', begin)) != std::string_view::npos; begin = end + 1) {
    const std::string_view line = trimTrailing(text.substr(begin, end - begin));
    if (!line.empty() && line.front() != '#') return end + 1;
  }
  return text.size();
}

}  // namespace

RowChecksums::RowChecksums(std::vector<RowChecksum> rows) : rows_(std::move(rows)) {
  if (!std::is_sorted(rows_.begin(), rows_.end(), isBefore)) std::stable_sort(rows_.begin(), rows_.end(), isBefore);
}

std::span<const RowChecksum> RowChecksums::of(int number) const {
  // Nearly always each has one, and none is missing.
  const auto usual = static_cast<std::size_t>(std::max(number, 1)) - 1;
  const auto isOf = [&](std::size_t i) { return i < rows_.size() && rows_[i].number == number; };
  if (isOf(usual) && !isOf(usual + 1) && (usual == 0 || !isOf(usual - 1))) return {&rows_[usual], 1};
  const auto [begin, end] = std::equal_range(rows_.begin(), rows_.end(), RowChecksum{number, 0}, isBefore);
  return {begin, end};
}

bool RowChecksums::has(const RowChecksum& row) const {
  const std::span<const RowChecksum> all = of(row.number);
  return std::any_of(all.begin(), all.end(), [&row](const auto& one) { return one.checksum == row.checksum; });
}

std::string rowChecksumText(const RowChecksum& row) {
  return fmt::format("{}\t{:016x}\n", row.number, row.checksum);
}

RowChecksums readRowChecksums(std::string_view text) {
  const ReadTable head = readDataTable(text.substr(0, headLength(text)));
  if (head.columns != columns()) return {};
  std::vector<RowChecksum> read;
  read.reserve(static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n')));
  for (std::size_t begin = headLength(text), end = 0; (end = text.find('\n', begin)) != text.npos; begin = end + 1) {
    const std::string_view line = text.substr(begin, end - begin);
    const std::size_t tab = line.find('\t');
    if (tab == std::string_view::npos || line.front() == '#') continue;
    std::string_view cell = line.substr(tab + 1);
    if (cell.ends_with('\r')) cell.remove_suffix(1);
    const auto number = parseInteger(line.substr(0, tab));
    const auto checksum = readChecksum(cell);
    if (number && checksum) read.push_back({*number, *checksum});
  }
  return RowChecksums(std::move(read));
}

RowChecksumFile::RowChecksumFile(std::string path, std::vector<std::string> tableHead)
    : path_(std::move(path)), tableHead_(std::move(tableHead)) {}

std::string RowChecksumFile::text(std::span<const RowChecksum> rows) const {
  std::string text = dataTableHead({{}, tableHead_, columns(), {}});
  text.reserve(text.size() + rows.size() * (kDigits + 12));
  for (const RowChecksum& row : rows) {
    fmt::format_to(std::back_inserter(text), "{}\t{:016x}\n", row.number, row.checksum);
  }
  return text;
}

void RowChecksumFile::complete(std::span<const RowChecksum> earlier) const {
  const RowChecksums present = readRowChecksums(readFileIfThere(path_).value_or(""));
  if (std::all_of(earlier.begin(), earlier.end(), [&present](const auto& row) { return present.has(row); })) return;
  std::vector<RowChecksum> all(earlier.begin(), earlier.end());
  all.insert(all.end(), present.begin(), present.end());
  std::string reason;
  if (!replaceFile(path_, text(all), reason)) fatalError("Error: Unable to write to " + path_, reason);
}

void RowChecksumFile::open(std::span<const RowChecksum> earlier) {
  if (earlier.empty()) {
    file_.open(path_);
    file_.append(text({}));
    return;
  }
  file_.openToContinue(path_, text(earlier));
}

void RowChecksumFile::add(const RowChecksum& row) {
  file_.append(rowChecksumText(row));
}

bool RowChecksumFile::replace(std::span<const RowChecksum> rows, std::string& reason) const {
  if (replaceFile(path_, text(rows), reason)) return true;
  reason = fmt::format("{}: {}", path_, reason);
  return false;
}

bool RowChecksumFile::tryClose(std::string& reason) {
  if (file_.tryClose(reason)) return true;
  reason = fmt::format("{}: {}", path_, reason);
  return false;
}

}  // namespace mirevo

#include "run/results/row_checksums.h"

#include <algorithm>
#include <charconv>
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

}  // namespace

std::string rowChecksumText(const RowChecksum& row) {
  return dataTableRow({std::int64_t{row.number}, fmt::format("{:016x}", row.checksum)});
}

RowChecksums readRowChecksums(std::string_view text) {
  RowChecksums read;
  const ReadTable table = readDataTable(text);
  if (table.columns != columns()) return read;
  for (const std::vector<std::string>& cells : table.rows) {
    const auto number = parseInteger(cells[0]);
    const auto checksum = readChecksum(cells[1]);
    if (number && checksum) read.emplace(*number, *checksum);
  }
  return read;
}

RowChecksumFile::RowChecksumFile(std::string path, std::vector<std::string> tableHead)
    : path_(std::move(path)), tableHead_(std::move(tableHead)) {}

std::string RowChecksumFile::text(std::span<const RowChecksum> rows) const {
  std::string text = dataTableHead({{}, tableHead_, columns(), {}});
  for (const RowChecksum& row : rows) text += rowChecksumText(row);
  return text;
}

void RowChecksumFile::complete(std::span<const RowChecksum> earlier) const {
  const RowChecksums present = readRowChecksums(readFileIfThere(path_).value_or(""));
  const auto isPresent = [&present](const RowChecksum& row) {
    const auto [begin, end] = present.equal_range(row.number);
    return std::any_of(begin, end, [&row](const auto& entry) { return entry.second == row.checksum; });
  };
  if (std::all_of(earlier.begin(), earlier.end(), isPresent)) return;
  std::vector<RowChecksum> all(earlier.begin(), earlier.end());
  for (const auto& [number, checksum] : present) all.push_back({number, checksum});
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

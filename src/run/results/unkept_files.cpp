#include "run/results/unkept_files.h"

#include <algorithm>
#include <cstdint>
#include <utility>

#include "common/data_table.h"
#include "common/files.h"
#include "common/text.h"

namespace mirevo {
namespace {

const std::vector<std::string>& columns() {
  static const std::vector<std::string> kColumns{"Evaluation", "File", "Reason"};
  return kColumns;
}

/// Of an evaluation that has all its files since, a row without a file.
std::string rowsOf(int number, std::span<const UnkeptFile> files) {
  std::string text;
  for (const UnkeptFile& file : files) text += dataTableRow({std::int64_t{number}, file.name, file.reason});
  return files.empty() ? dataTableRow({std::int64_t{number}, std::string(), std::string("kept since")}) : text;
}

}  // namespace

UnkeptByNumber readUnkeptTable(std::string_view text) {
  UnkeptByNumber read;
  const ReadTable table = readDataTable(text);
  if (table.columns != columns()) return read;
  for (const std::vector<std::string>& cells : table.rows) {
    const auto number = parseInteger(cells[0]);
    if (!number || *number < 1) continue;
    if (cells[1].empty()) {
      read.erase(*number);
      continue;
    }
    std::vector<UnkeptFile>& files = read[*number];
    std::erase_if(files, [&](const UnkeptFile& file) { return file.name == cells[1]; });
    files.push_back({cells[1], cells[2]});
  }
  return read;
}

std::string unkeptTableText(std::span<const std::string> head, const UnkeptByNumber& files) {
  std::string text = dataTableHead({{}, {head.begin(), head.end()}, columns(), {}});
  for (const auto& [number, of] : files) text += rowsOf(number, of);
  return text;
}

UnkeptFiles::UnkeptFiles(std::string path, std::vector<std::string> tableHead)
    : path_(std::move(path)), tableHead_(std::move(tableHead)) {}

std::set<int> UnkeptFiles::goOn(const std::function<bool(int)>& hasSucceeded, const std::set<std::string>& names) {
  const auto present = readFileIfThere(path_);
  if (!present) return {};
  files_ = readUnkeptTable(*present);
  for (auto& [number, files] : files_) {
    std::erase_if(files, [&](const UnkeptFile& file) { return !names.contains(file.name); });
  }
  std::erase_if(files_, [&](const auto& entry) { return !hasSucceeded(entry.first) || entry.second.empty(); });
  file_.openToContinue(path_, unkeptTableText(tableHead_, files_));
  std::set<int> found;
  for (const auto& [number, files] : files_) found.insert(number);
  return found;
}

void UnkeptFiles::add(int number, std::span<const UnkeptFile> files) {
  std::string text = rowsOf(number, {});  // what was noted before of this evaluation does not count any more
  if (!files.empty()) text = (files_.contains(number) ? text : std::string()) + rowsOf(number, files);
  if (!file_.isOpen()) {
    file_.open(path_);
    text.insert(0, dataTableHead({{}, tableHead_, columns(), {}}));
  }
  file_.append(text);
  files_[number].assign(files.begin(), files.end());
  if (files.empty()) files_.erase(number);
}

}  // namespace mirevo

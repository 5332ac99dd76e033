#include "run/results/simulated_values_file.h"

#include <cassert>
#include <cstdint>
#include <cstring>
#include <string_view>
#include <utility>

#include "common/checksum.h"
#include "common/fatal_error.h"
#include "common/files.h"

namespace mirevo {
namespace {

/// Of a file of single precision and of an exact one. The last bytes show whether a machine stores numbers in another
/// byte order.
struct FormatMarks {
  std::uint64_t single = 0;
  std::uint64_t exact = 0;
};
constexpr FormatMarks kMarks{0x4d69726576307633ULL, 0x4d69726576307634ULL};
/// Of earlier versions, whose checksums do not depend on the row.
constexpr FormatMarks kMarksWithoutRow{0x4d69726576307631ULL, 0x4d69726576307632ULL};

template <class Number>
void appendBytes(std::string& bytes, const Number& number) {
  bytes.append(reinterpret_cast<const char*>(&number), sizeof number);
}

template <class Number>
Number numberAt(std::string_view bytes, std::size_t offset) {
  Number number{};
  std::memcpy(&number, bytes.data() + offset, sizeof number);
  return number;
}

std::string headOf(const FormatMarks& marks, SeriesPrecision precision, std::size_t count) {
  std::string bytes;
  appendBytes(bytes, precision == SeriesPrecision::exact ? marks.exact : marks.single);
  appendBytes(bytes, static_cast<std::uint64_t>(count));
  return bytes;
}

/// Also of what the row of the evaluation has, so that a record of another run is none of this one's.
std::uint64_t checksumWithRow(std::string_view content, std::span<const double> parameterValues,
                              std::span<const double> measureValues) {
  std::string bytes(content);
  for (const std::span<const double> values : {parameterValues, measureValues}) {
    bytes.append(reinterpret_cast<const char*>(values.data()), values.size_bytes());
  }
  return checksumOf(bytes);
}

}  // namespace

SimulatedValuesFile::SimulatedValuesFile(std::string path, std::size_t valueCount, SeriesPrecision precision,
                                         std::size_t exactMeasureCount)
    : path_(std::move(path)), valueCount_(valueCount), precision_(precision), exactMeasureCount_(exactMeasureCount) {}

std::string SimulatedValuesFile::head() const {
  return headOf(kMarks, precision_, recordedCount());
}

void SimulatedValuesFile::create() {
  file_.open(path_);
  file_.append(head());
}

void SimulatedValuesFile::add(std::span<const double> parameterValues, const EvaluationResult& result) {
  assert(result.simulatedValues.size() == valueCount_ && result.exactMeasures.size() == exactMeasureCount_);
  std::string bytes;
  appendBytes(bytes, static_cast<std::int64_t>(result.number));
  for (const std::vector<double>* const values : {&result.simulatedValues, &result.exactMeasures}) {
    bytes.append(reinterpret_cast<const char*>(values->data()), values->size() * sizeof(double));
  }
  appendBytes(bytes, checksumWithRow(bytes, parameterValues, result.measureValues));
  file_.append(bytes);
}

std::map<int, KeptValues> SimulatedValuesFile::takeUp(std::span<const ResultRow> rows) {
  std::string reason;
  const std::string content = readFileIfThere(path_).value_or("");
  std::string kept = head();
  std::map<int, KeptValues> found;
  std::map<std::int64_t, const ResultRow*> succeeded;
  for (const ResultRow& row : rows) {
    if (row.ok) succeeded.emplace(row.number, &row);
  }
  const std::size_t contentLength = sizeof(std::int64_t) + recordedCount() * sizeof(double);
  const std::size_t recordLength = contentLength + sizeof(std::uint64_t);
  std::string_view rest = content;
  const bool hasRow = rest.starts_with(kept);
  if (!hasRow && !rest.starts_with(headOf(kMarksWithoutRow, precision_, recordedCount()))) rest = {};
  if (!rest.empty()) rest.remove_prefix(kept.size());
  for (; rest.size() >= recordLength; rest.remove_prefix(recordLength)) {
    const std::string_view record = rest.substr(0, contentLength);
    const auto row = succeeded.find(numberAt<std::int64_t>(record, 0));
    if (row == succeeded.end()) continue;
    const std::uint64_t checksum = checksumWithRow(record, row->second->parameters, row->second->measures);
    if (numberAt<std::uint64_t>(rest, contentLength) != (hasRow ? checksum : checksumOf(record))) continue;
    KeptValues values{std::vector<double>(valueCount_), std::vector<double>(exactMeasureCount_)};
    const char* from = record.data() + sizeof(std::int64_t);
    for (std::vector<double>* const part : {&values.simulatedValues, &values.exactMeasures}) {
      if (!part->empty()) std::memcpy(part->data(), from, part->size() * sizeof(double));
      from += part->size() * sizeof(double);
    }
    if (!found.emplace(row->second->number, std::move(values)).second) continue;
    kept += record;
    appendBytes(kept, checksum);
  }
  if (kept != content && !replaceFile(path_, kept, reason)) fatalError("Error: Unable to write to " + path_, reason);
  file_.openToContinue(path_);
  return found;
}

}  // namespace mirevo

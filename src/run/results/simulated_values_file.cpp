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

/// The last bytes show whether a machine stores numbers in another byte order.
constexpr std::uint64_t kFormatMark = 0x4d69726576307631ULL;
/// Exact values, which earlier versions kept in 32 bits under the other mark.
constexpr std::uint64_t kExactFormatMark = 0x4d69726576307632ULL;

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

}  // namespace

SimulatedValuesFile::SimulatedValuesFile(std::string path, std::size_t valueCount, SeriesPrecision precision,
                                         std::size_t exactMeasureCount)
    : path_(std::move(path)), valueCount_(valueCount), precision_(precision), exactMeasureCount_(exactMeasureCount) {}

std::string SimulatedValuesFile::head() const {
  std::string bytes;
  appendBytes(bytes, precision_ == SeriesPrecision::exact ? kExactFormatMark : kFormatMark);
  appendBytes(bytes, static_cast<std::uint64_t>(recordedCount()));
  return bytes;
}

void SimulatedValuesFile::create() {
  file_.open(path_);
  file_.append(head());
}

void SimulatedValuesFile::add(const EvaluationResult& result) {
  assert(result.simulatedValues.size() == valueCount_ && result.exactMeasures.size() == exactMeasureCount_);
  std::string bytes;
  appendBytes(bytes, static_cast<std::int64_t>(result.number));
  for (const std::vector<double>* const values : {&result.simulatedValues, &result.exactMeasures}) {
    bytes.append(reinterpret_cast<const char*>(values->data()), values->size() * sizeof(double));
  }
  appendBytes(bytes, checksumOf(bytes));
  file_.append(bytes);
}

std::map<int, KeptValues> SimulatedValuesFile::takeUp(const std::set<int>& numbers) {
  std::string reason;
  const std::string content = readFileIfThere(path_).value_or("");
  std::string kept = head();
  std::map<int, KeptValues> found;
  const std::size_t contentLength = sizeof(std::int64_t) + recordedCount() * sizeof(double);
  const std::size_t recordLength = contentLength + sizeof(std::uint64_t);
  std::string_view rest = content;
  if (!rest.starts_with(kept)) rest = {};
  if (!rest.empty()) rest.remove_prefix(kept.size());
  for (; rest.size() >= recordLength; rest.remove_prefix(recordLength)) {
    const std::string_view record = rest.substr(0, recordLength);
    const auto number = numberAt<std::int64_t>(record, 0);
    const bool isSound = checksumOf(record.substr(0, contentLength)) == numberAt<std::uint64_t>(record, contentLength);
    if (!isSound || numbers.count(static_cast<int>(number)) == 0) continue;
    KeptValues values{std::vector<double>(valueCount_), std::vector<double>(exactMeasureCount_)};
    const char* from = record.data() + sizeof(std::int64_t);
    for (std::vector<double>* const part : {&values.simulatedValues, &values.exactMeasures}) {
      if (!part->empty()) std::memcpy(part->data(), from, part->size() * sizeof(double));
      from += part->size() * sizeof(double);
    }
    if (found.emplace(static_cast<int>(number), std::move(values)).second) kept += record;
  }
  if (kept != content && !replaceFile(path_, kept, reason)) fatalError("Error: Unable to write to " + path_, reason);
  file_.openToContinue(path_);
  return found;
}

}  // namespace mirevo

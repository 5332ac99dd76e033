#include "run/results/simulated_values_file.h"

#include <algorithm>
#include <cassert>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <limits>
#include <optional>
#include <string_view>
#include <utility>

#include <fmt/core.h>

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

/// The row of a successful evaluation; empty for another number.
std::optional<ResultRow> succeeded(const ResultRows& rows, std::int64_t number) {
  if (number < 1 || number > std::numeric_limits<int>::max()) return std::nullopt;
  const std::size_t index = rows.find(static_cast<int>(number));
  return index < rows.size() && rows.isOk(index) ? std::optional(rows[index]) : std::nullopt;
}

}  // namespace

SimulatedValuesFile::SimulatedValuesFile(std::string path, std::size_t valueCount, SeriesPrecision precision,
                                         std::size_t exactMeasureCount, bool isReadBack,
                                         std::optional<std::uint64_t> timesChecksum)
    : path_(std::move(path)),
      valueCount_(valueCount),
      precision_(precision),
      exactMeasureCount_(exactMeasureCount),
      isReadBack_(isReadBack),
      timesChecksum_(timesChecksum) {}

std::string SimulatedValuesFile::head() const {
  std::string bytes = headOf(kMarks, precision_, recordedCount());
  if (timesChecksum_) appendBytes(bytes, *timesChecksum_);
  return bytes;
}

bool SimulatedValuesFile::hasOtherTimes() const {
  if (!timesChecksum_) return false;
  const std::string expected = head();
  const std::string found = readFileIfThere(path_, expected.size()).value_or("");
  const auto mark = static_cast<std::ptrdiff_t>(sizeof(std::uint64_t));
  return found.size() == expected.size() && found != expected &&
         std::equal(found.begin(), found.begin() + mark, expected.begin());
}

void SimulatedValuesFile::create() {
  offsets_.clear();
  file_.open(path_);
  file_.append(head());
}

void SimulatedValuesFile::add(std::span<const double> parameterValues, const EvaluationResult& result) {
  assert(result.exactMeasures.size() == exactMeasureCount_);
  if (result.simulatedValues.size() != valueCount_) {
    fatalError("Error: Unable to write to " + path_,
               fmt::format("evaluation No. {} has {} simulated values instead of {}: do all processes of the job read "
                           "the same observations and the same model folder?",
                           result.number, result.simulatedValues.size(), valueCount_));
  }
  std::string bytes;
  appendBytes(bytes, static_cast<std::int64_t>(result.number));
  for (const std::vector<double>* const values : {&result.simulatedValues, &result.exactMeasures}) {
    bytes.append(reinterpret_cast<const char*>(values->data()), values->size() * sizeof(double));
  }
  appendBytes(bytes, checksumWithRow(bytes, parameterValues, result.measureValues));
  if (!file_.append(bytes)) return;
  noteOffset(result.number, file_.size() - std::ssize(bytes));
}

/// Replaces a file of an earlier version, whose checksums do not depend on the rows.
void SimulatedValuesFile::addRowsToChecksums(const ResultRows& rows) const {
  if (timesChecksum_) return;  // earlier versions had no such files
  const std::string earlierHead = headOf(kMarksWithoutRow, precision_, recordedCount());
  if (readFileIfThere(path_, earlierHead.size()) != earlierHead) return;
  const std::string content = readFileIfThere(path_).value_or("");
  std::string bytes = head();
  std::string_view rest = std::string_view(content).substr(earlierHead.size());
  for (; rest.size() >= recordLength(); rest.remove_prefix(recordLength())) {
    const std::string_view record = rest.substr(0, contentLength());
    const auto row = succeeded(rows, numberAt<std::int64_t>(record, 0));
    if (!row || checksumOf(record) != numberAt<std::uint64_t>(rest, contentLength())) continue;
    bytes += record;
    appendBytes(bytes, checksumWithRow(record, row->parameters, row->measures));
  }
  std::string reason;
  if (!replaceFile(path_, bytes, reason)) fatalError("Error: Unable to write to " + path_, reason);
}

std::int64_t SimulatedValuesFile::walkRecords(const ResultRows& rows,
                                              const std::function<void(int number, const char* values)>& take) {
  offsets_.clear();
  std::string record(recordLength(), '\0');
  auto offset = static_cast<std::int64_t>(head().size());
  const auto length = static_cast<std::int64_t>(record.size());
  for (; offset + length <= file_.size(); offset += length) {
    read(offset, record.data(), record.size());
    const std::string_view content = std::string_view(record).substr(0, contentLength());
    const auto row = succeeded(rows, numberAt<std::int64_t>(record, 0));
    if (!row ||
        checksumWithRow(content, row->parameters, row->measures) != numberAt<std::uint64_t>(record, contentLength())) {
      continue;
    }
    take(row->number, record.data() + sizeof(std::int64_t));
    noteOffset(row->number, offset);
  }
  return offset;
}

std::map<int, KeptValues> SimulatedValuesFile::takeUp(const ResultRows& rows) {
  addRowsToChecksums(rows);
  const std::string expected = head();
  if (readFileIfThere(path_, expected.size()) != expected) {
    create();
    return {};
  }
  file_.openToContinue(path_);
  std::map<int, KeptValues> found;
  const std::int64_t end = walkRecords(rows, [&](int number, const char* from) {
    KeptValues values{std::vector<double>(isReadBack_ ? 0 : valueCount_), std::vector<double>(exactMeasureCount_)};
    if (!values.simulatedValues.empty()) std::memcpy(values.simulatedValues.data(), from, valueCount_ * sizeof(double));
    from += valueCount_ * sizeof(double);
    if (exactMeasureCount_ > 0) std::memcpy(values.exactMeasures.data(), from, exactMeasureCount_ * sizeof(double));
    found.insert_or_assign(number, std::move(values));
  });
  if (end < file_.size()) file_.cutTo(end);
  return found;
}

std::optional<std::size_t> SimulatedValuesFile::openToRead(const ResultRows& rows) {
  const std::string expected = head();
  if (readFileIfThere(path_, expected.size()) != expected) return std::nullopt;
  file_.openToRead(path_);
  walkRecords(rows, [](int /*number*/, const char* /*values*/) {});
  const auto isKnown = [](std::int64_t offset) { return offset > 0; };
  return static_cast<std::size_t>(std::count_if(offsets_.begin(), offsets_.end(), isKnown));
}

void SimulatedValuesFile::noteOffset(int number, std::int64_t offset) {
  const auto place = static_cast<std::size_t>(number);
  if (offsets_.size() < place) offsets_.resize(place);
  offsets_[place - 1] = offset;
}

std::int64_t SimulatedValuesFile::offsetOf(int number) const {
  const std::int64_t offset = offsets_.at(static_cast<std::size_t>(number) - 1);
  assert(offset > 0);
  return offset;
}

void SimulatedValuesFile::read(std::int64_t offset, char* bytes, std::size_t size) const {
  std::string reason;
  if (!file_.tryRead(offset, bytes, size, reason)) fatalError("Error: Unable to read " + path_, reason);
}

std::vector<double> SimulatedValuesFile::valuesOf(int number) const {
  return columns(std::span(&number, 1), 0, valueCount_);
}

std::vector<double> SimulatedValuesFile::exactMeasuresOf(int number) const {
  return columns(std::span(&number, 1), valueCount_, exactMeasureCount_);
}

std::vector<double> SimulatedValuesFile::columns(std::span<const int> numbers, std::size_t first,
                                                 std::size_t count) const {
  std::vector<double> values(numbers.size() * count);
  std::vector<double> ofOne(count);
  for (std::size_t i = 0; i < numbers.size(); ++i) {
    const std::int64_t offset = offsetOf(numbers[i]);
    std::int64_t number = 0;
    read(offset, reinterpret_cast<char*>(&number), sizeof number);
    if (number != numbers[i]) fatalError("Error: Unable to read " + path_, "another program has changed it");
    const auto start = offset + static_cast<std::int64_t>(sizeof number + first * sizeof(double));
    read(start, reinterpret_cast<char*>(ofOne.data()), count * sizeof(double));
    for (std::size_t j = 0; j < count; ++j) values[j * numbers.size() + i] = ofOne[j];
  }
  return values;
}

}  // namespace mirevo

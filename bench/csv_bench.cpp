// Reading a simulated series from a CSV file, as after every model run: the program's reader compared with a plain loop
// of fgets, sscanf and strtod. Arguments: items, of which the last is read, and rows: ten hourly years, and files of
// 59 MB that are long or wide.

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <unistd.h>
#include <utility>
#include <vector>

#include <benchmark/benchmark.h>
#include <fmt/format.h>

#include "common/calendar.h"
#include "platform/series/csv_time_series.h"

namespace {

constexpr int kTenYears = 87600;
constexpr int kLongFile = 2'250'000;  ///< rows of 59 MB with one item
constexpr int kWideFile = 63;         ///< items of 59 MB in ten years

/// A file of hourly rows with `items` items, removed at the end of the program.
class SampleFile final {
 public:
  SampleFile(int items, int rows)
      : path_(fmt::format("{}/csv_bench_{}_{}_{}.csv", std::filesystem::temp_directory_path().string(), getpid(), items,
                          rows)) {
    std::ofstream out(path_);
    out << "time";
    for (int item = 1; item <= items; ++item) out << ",Q" << item;
    out << '\n';
    const std::int64_t start = mirevo::secondNumber({1791, 1, 1});
    for (int row = 0; row < rows; ++row) {
      out << mirevo::formatDate(mirevo::dateOfSecond(start + row * std::int64_t{3600}));
      for (int item = 1; item <= items; ++item) out << fmt::format(",{:.4f}", (row * 37 % 100003) * 0.013 + item);
      out << '\n';
    }
  }
  ~SampleFile() { std::remove(path_.c_str()); }
  SampleFile(const SampleFile&) = delete;
  SampleFile& operator=(const SampleFile&) = delete;
  const std::string& path() const { return path_; }

 private:
  std::string path_;
};

const SampleFile& sampleFile(const benchmark::State& state) {
  static std::map<std::pair<int, int>, SampleFile> files;
  const std::pair key(static_cast<int>(state.range(0)), static_cast<int>(state.range(1)));
  return files.try_emplace(key, key.first, key.second).first->second;
}

/// Opens the file and reads its last item.
void BM_CsvTimeSeries(benchmark::State& state) {
  const int item = static_cast<int>(state.range(0));
  const auto rows = static_cast<std::size_t>(state.range(1));
  const std::string& path = sampleFile(state).path();
  for (auto _ : state) {
    mirevo::CsvTimeSeries series;
    if (!series.open(path) || !series.getData(item)) state.SkipWithError(series.lastError().c_str());
    benchmark::DoNotOptimize(series.values(item).data());
    if (static_cast<std::size_t>(series.timeStepCount()) != rows) state.SkipWithError("rows are missing");
  }
  state.SetItemsProcessed(state.iterations() * state.range(1));
}

/// The plain way: line by line, sscanf for the time, strtod for the value. Checks only the order of the times.
void BM_PlainLoop(benchmark::State& state) {
  const int item = static_cast<int>(state.range(0));
  const auto rows = static_cast<std::size_t>(state.range(1));
  const std::string& path = sampleFile(state).path();
  for (auto _ : state) {
    std::vector<double> times;
    std::vector<float> values;
    std::FILE* file = std::fopen(path.c_str(), "r");
    char line[4096];
    if (std::fgets(line, sizeof line, file) == nullptr) state.SkipWithError("no header");
    while (std::fgets(line, sizeof line, file) != nullptr) {
      const char* cell = line;
      int field[5] = {};
      if (std::sscanf(line, "%d-%d-%d %d:%d", &field[0], &field[1], &field[2], &field[3], &field[4]) != 5) break;
      const auto days = static_cast<double>(mirevo::dayNumber(field[0], field[1], field[2]));
      times.push_back(days + field[3] / 24.0 + field[4] / 1440.0);
      for (int i = 0; i < item && cell != nullptr; ++i) cell = std::strchr(cell + 1, ',');
      if (cell == nullptr) break;
      values.push_back(static_cast<float>(std::strtod(cell + 1, nullptr)));
    }
    std::fclose(file);
    if (times.size() != rows || values.size() != rows) state.SkipWithError("rows are missing");
    benchmark::DoNotOptimize(values.data());
  }
  state.SetItemsProcessed(state.iterations() * state.range(1));
}

/// The lower limit: only reads the bytes of the file.
void BM_ReadBytes(benchmark::State& state) {
  const std::string& path = sampleFile(state).path();
  for (auto _ : state) {
    std::ifstream in(path, std::ios::binary);
    std::string content(std::filesystem::file_size(path), '\0');
    in.read(content.data(), static_cast<std::streamsize>(content.size()));
    benchmark::DoNotOptimize(content.data());
  }
}

void files(benchmark::internal::Benchmark* bench) {
  bench->Args({1, kTenYears})->Args({10, kTenYears})->Args({1, kLongFile})->Args({kWideFile, kTenYears});
  bench->Unit(benchmark::kMillisecond);
}

BENCHMARK(BM_CsvTimeSeries)->Apply(files);
BENCHMARK(BM_PlainLoop)->Apply(files);
BENCHMARK(BM_ReadBytes)->Apply(files);

}  // namespace

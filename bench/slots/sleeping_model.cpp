// A model that sleeps: sleeping_model (equal|exponential|smooth) MEAN-SECONDS LOG [ROWS]
//
// It reads `parameters.txt`, one value a line, writes the value of a function of the parameters as the series
// `simulated.csv`, and sleeps for the rest of its time. That depends on the parameters alone: the mean, a time that is
// exponentially distributed over different parameters, as if they had nothing to do with it, or (smooth) one that grows
// steadily with the first three of them, over about two orders of magnitude, as time steps and cell sizes make it. The
// series has three days, or so many rows of ten minutes. It appends its start and end to the log, in seconds of the
// monotonic clock.
#include <algorithm>
#include <bit>
#include <chrono>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <fstream>
#include <string>
#include <string_view>
#include <thread>
#include <unistd.h>
#include <vector>

namespace {

double now() {
  return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count();
}

/// A number in (0, 1) that the parameters tell: their bits, mixed.
double uniformOf(const std::vector<double>& parameters) {
  std::uint64_t bits = 0;
  for (const double value : parameters) {
    bits = (bits ^ std::bit_cast<std::uint64_t>(value)) * 0x9E3779B97F4A7C15U;
    bits ^= bits >> 29;
    bits *= 0xBF58476D1CE4E5B9U;
    bits ^= bits >> 32;
  }
  return (static_cast<double>(bits >> 11) + 0.5) / 9007199254740992.0;
}

/// Ackley's function about (1, 1, ...).
double ackley(const std::vector<double>& parameters) {
  double squares = 0.0;
  double cosines = 0.0;
  for (const double value : parameters) {
    squares += (value - 1.0) * (value - 1.0);
    cosines += std::cos(2.0 * std::acos(-1.0) * (value - 1.0));
  }
  const auto n = static_cast<double>(parameters.size());
  return 20.0 - 20.0 * std::exp(-0.2 * std::sqrt(squares / n)) + std::exp(1.0) - std::exp(cosines / n);
}

/// About 1 for parameters that are spread over [-20, 30].
double growth(const std::vector<double>& parameters) {
  double sum = 0.0;
  for (std::size_t j = 0; j < 3 && j < parameters.size(); ++j) sum += (parameters[j] - 5.0) / 25.0;
  return 0.6 * std::exp(std::clamp(sum, -3.0, 3.0));
}

void writeDays(double value) {
  std::ofstream series("simulated.csv");
  series << "time,value\n";
  for (const int day : {1, 2, 3}) series << "2001-01-0" << day << "," << value << "\n";
}

/// A day of them is made once, and then has its date changed: a model that computes for half a second, and not to write
/// its file, is what is meant.
void writeRows(double value, int rows) {
  using namespace std::chrono;
  constexpr int kRowsOfDay = 144;
  char line[64];
  std::string day;
  for (int row = 0; row < kRowsOfDay; ++row) {
    const int minute = 10 * row;
    const int length =
        std::snprintf(line, sizeof line, "2001-01-01 %02d:%02d,%.5f%d\n", minute / 60, minute % 60, value, row % 10);
    day.append(line, static_cast<std::size_t>(length));
  }
  const std::size_t length = day.size() / kRowsOfDay;
  std::string text = "time,value\n";
  text.reserve(text.size() + length * static_cast<std::size_t>(rows + kRowsOfDay));
  for (sys_days date = 2001y / January / 1; rows > 0; date += days{1}, rows -= kRowsOfDay) {
    const year_month_day parts{date};
    std::snprintf(line, sizeof line, "%04d-%02u-%02u", static_cast<int>(parts.year()),
                  static_cast<unsigned>(parts.month()), static_cast<unsigned>(parts.day()));
    for (std::size_t row = 0; row < kRowsOfDay; ++row) day.replace(row * length, 10, line, 10);
    text += day;
  }
  std::ofstream("simulated.csv") << text;
}

}  // namespace

int main(int argc, char** argv) {
  const double start = now();
  if (argc != 4 && argc != 5) return 2;
  std::vector<double> parameters;
  std::ifstream file("parameters.txt");
  for (double value = 0.0; file >> value;) parameters.push_back(value);
  if (parameters.empty()) return 2;
  const bool isEqual = std::string_view(argv[1]) == "equal";
  const double mean = std::atof(argv[2]);
  const bool isSmooth = std::string_view(argv[1]) == "smooth";
  const double seconds = isEqual    ? mean
                         : isSmooth ? mean * growth(parameters)
                                    : -mean * std::log(uniformOf(parameters));
  argc == 5 ? writeRows(ackley(parameters), std::atoi(argv[4])) : writeDays(ackley(parameters));
  std::this_thread::sleep_for(std::chrono::duration<double>(start + seconds - now()));
  char line[80];
  const int length = std::snprintf(line, sizeof line, "%.6f %.6f\n", start, now());
  const int log = ::open(argv[3], O_WRONLY | O_APPEND | O_CREAT, 0666);
  return log >= 0 && ::write(log, line, static_cast<std::size_t>(length)) == length ? 0 : 2;
}

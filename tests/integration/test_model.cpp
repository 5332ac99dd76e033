// The small model that process, evaluation and integration tests and the whole-program benchmarks run.
//
//   test_model [--NAME VALUE]...
//
// It reads `parameters.txt` in its working directory, lines of the form `name = value`, and writes `simulated.csv`: a
// header, then one daily value a line from 2001-01-01 00:00 on, for t = 0, 1, ... 364 days
//
//   simulated(t) = a + b * sin(t / 58) + c * t / 365          (a, b and c are 0 where the file does not give them)
//
// Every option below may also stand in the parameter file, so that a run's own parameters decide how it behaves; the
// command line wins. What is to happen before the results are written comes in the order of this list:
//
//   parameters FILE     the parameter file                                                  (parameters.txt)
//   ignore-term 1       ignore SIGTERM
//   grandchild FILE     fork a process that ignores SIGTERM and stays; its id goes into FILE
//   sleep-ms N          sleep
//   fail-above X        exit with code 3 when a is greater than X
//   fail-share X        exit with code 3 for about this share of the sets of x1, x2 ..., as if at random
//   function NAME       write the value of "ishigami" or "g" at x1, x2 ... into `value.txt` instead of the series
//
// A file that cannot be read or written, or an unknown option, ends it with code 2 and a message on standard error.
#include <algorithm>
#include <array>
#include <chrono>
#include <cmath>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <iomanip>
#include <map>
#include <sstream>
#include <string>
#include <string_view>
#include <unistd.h>
#include <vector>

namespace {

[[noreturn]] void giveUp(const std::string& message) {
  std::fprintf(stderr, "test_model: %s\n", message.c_str());
  std::exit(2);
}

class Settings {
 public:
  Settings(int argc, char** argv) {
    static constexpr std::array<std::string_view, 7> kKnown{
        "--parameters", "--ignore-term", "--grandchild", "--sleep-ms", "--fail-above", "--fail-share", "--function"};
    for (int i = 1; i < argc; i += 2) {
      if (i + 1 == argc || std::ranges::find(kKnown, argv[i]) == kKnown.end()) giveUp(argv[i]);
      values_[argv[i] + 2] = argv[i + 1];
    }
    const std::string fileName = text("parameters", "parameters.txt");
    std::ifstream file(fileName);
    if (!file) giveUp("cannot read " + fileName);
    for (std::string line, name, equals, value; std::getline(file, line);) {
      if (std::istringstream(line) >> name >> equals >> value && equals == "=") values_.emplace(name, value);
    }
  }
  std::string text(const std::string& name, const std::string& otherwise = "") const {
    const auto found = values_.find(name);
    return found == values_.end() ? otherwise : found->second;
  }
  double number(const std::string& name, double otherwise = 0.0) const {
    return values_.contains(name) ? std::strtod(text(name).c_str(), nullptr) : otherwise;
  }

 private:
  std::map<std::string, std::string> values_;
};

void leaveGrandchild(const std::string& pidFile) {
  const auto before = std::signal(SIGTERM, SIG_IGN);
  const pid_t child = fork();
  if (child == 0) {
    alarm(120);  // should nobody end it
    while (true) pause();
  }
  std::signal(SIGTERM, before);
  std::ofstream(pidFile) << child << '\n';
}

void writeResults(double a, double b, double c) {
  std::FILE* const file = std::fopen("simulated.csv", "w");
  if (file == nullptr) giveUp("cannot write simulated.csv");
  std::fputs("time,simulated\n", file);
  for (int t = 0; t < 365; ++t) {
    const std::chrono::year_month_day day =
        std::chrono::sys_days(std::chrono::January / 1 / 2001) + std::chrono::days(t);
    std::fprintf(file, "%04d-%02u-%02u,%.9g\n", static_cast<int>(day.year()), static_cast<unsigned>(day.month()),
                 static_cast<unsigned>(day.day()), a + b * std::sin(t / 58.0) + c * t / 365.0);
  }
  const bool isWritten = std::ferror(file) == 0;
  if (std::fclose(file) != 0 || !isWritten) giveUp("cannot write simulated.csv");
}

/// x1, x2 ... of the file.
std::vector<double> unknowns(const Settings& settings) {
  std::vector<double> x;
  std::string name = "x";
  while (!settings.text(name.append(std::to_string(x.size() + 1))).empty()) {
    x.push_back(settings.number(name));
    name.resize(1);
  }
  return x;
}

/// Ishigami and Homma (1990) with a = 7 and b = 0.1, x in [-pi, pi]; the G function of Sobol' (1993) with a = 0,
/// 1, 4.5, 9, 99 ..., x in [0, 1].
void writeValue(const std::string& function, const std::vector<double>& x) {
  double value = 1.0;
  if (function == "ishigami" && x.size() == 3) {
    value = std::sin(x[0]) + 7.0 * std::pow(std::sin(x[1]), 2) + 0.1 * std::pow(x[2], 4) * std::sin(x[0]);
  } else if (function == "g") {
    for (std::size_t j = 0; j < x.size(); ++j) {
      static constexpr std::array kCoefficients{0.0, 1.0, 4.5, 9.0};
      const double a = j < kCoefficients.size() ? kCoefficients[j] : 99.0;
      value *= (std::abs(4.0 * x[j] - 2.0) + a) / (1.0 + a);
    }
  } else {
    giveUp("no function " + function);
  }
  std::ofstream("value.txt") << std::setprecision(17) << value << '\n';
}

/// Whether this set is one of the share that fails: by digits behind those that matter to the value.
bool isOfShare(double share, const std::vector<double>& x) {
  double sum = 0.0;
  for (const double value : x) sum += value;
  double whole = 0.0;
  return std::abs(std::modf(sum * 1.0e5, &whole)) < share;
}

}  // namespace

int main(int argc, char** argv) {
  const Settings settings(argc, argv);
  const double a = settings.number("a");
  if (settings.number("ignore-term") != 0) std::signal(SIGTERM, SIG_IGN);
  if (!settings.text("grandchild").empty()) leaveGrandchild(settings.text("grandchild"));
  const auto milliseconds = static_cast<long>(settings.number("sleep-ms"));
  timespec left{milliseconds / 1000, milliseconds % 1000 * 1'000'000};
  while (milliseconds > 0 && nanosleep(&left, &left) != 0) {
  }
  if (a > settings.number("fail-above", INFINITY)) {
    std::fprintf(stderr, "test_model: a = %g is too large\n", a);
    return 3;
  }
  const std::vector<double> x = unknowns(settings);
  if (settings.number("fail-share") > 0.0 && isOfShare(settings.number("fail-share"), x)) {
    std::fputs("test_model: this set fails\n", stderr);
    return 3;
  }
  if (!settings.text("function").empty()) {
    writeValue(settings.text("function"), x);
    return 0;
  }
  writeResults(a, settings.number("b"), settings.number("c"));
  return 0;
}

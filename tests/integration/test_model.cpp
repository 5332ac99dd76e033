// The small model that process, evaluation and integration tests and the whole-program benchmarks run.
//
//   test_model [--NAME VALUE]...
//
// It reads `parameters.txt` in its working directory, lines of the form `name = value` (`#` starts a comment), and
// writes `simulated.csv`: a header, then one daily value a line from 2001-01-01 00:00 on, with t = 0, 1, 2, ... days
//
//   simulated(t) = a + b * sin(t / 58) + c * t / 365          (a, b and c are 0 where the file does not give them)
//
// Every option below may also stand in the parameter file, so that a run's own parameters decide how it behaves; the
// command line wins. What is to happen before the results are written comes in the order of this list:
//
//   parameters FILE     the parameter file                                                  (parameters.txt)
//   output FILE         the results                                                         (simulated.csv)
//   steps N             number of values                                                    (365)
//   print-bytes N       print that many bytes to standard output, in lines of 80
//   message TEXT        print this line to standard error
//   close-output 1      close standard output and standard error
//   grandchild FILE     fork a process that ignores SIGTERM and stays; its id goes into FILE
//   ignore-term 1       ignore SIGTERM
//   sleep-ms N          sleep
//   fail-above X        exit with code 3 when a is greater than X
//   crash-above X       end by SIGABRT when a is greater than X
//   signal N            end by that signal
//   write HOW           all; half: half of the values, ending in mid-line; nan: every value NaN; empty: the header
//                       alone; nothing                                                      (all)
//   measure FILE        also write `a` and `a * b` as the two numbers of an output-measure file
//   exit-code N         exit with that code after the results are written                   (0)
//
// A parameter file that cannot be read, or an unknown option, ends it with code 2 and a message on standard error.
#include <algorithm>
#include <array>
#include <chrono>
#include <cmath>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fcntl.h>
#include <fstream>
#include <map>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

namespace {

using Settings = std::map<std::string, std::string>;

constexpr std::array<const char*, 15> kOptions = {
    "parameters", "output",     "steps",       "print-bytes", "message", "close-output", "grandchild", "ignore-term",
    "sleep-ms",   "fail-above", "crash-above", "signal",      "write",   "measure",      "exit-code"};

[[noreturn]] void giveUp(const std::string& message) {
  std::fprintf(stderr, "test_model: %s\n", message.c_str());
  std::exit(2);
}

std::string trim(const std::string& text) {
  const auto first = text.find_first_not_of(" \t\r");
  if (first == std::string::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t\r") - first + 1);
}

void readParameters(const std::string& fileName, Settings& settings) {
  std::ifstream file(fileName);
  if (!file) giveUp("cannot read " + fileName);
  for (std::string line; std::getline(file, line);) {
    line = line.substr(0, line.find('#'));
    const auto equals = line.find('=');
    if (equals != std::string::npos) settings.emplace(trim(line.substr(0, equals)), trim(line.substr(equals + 1)));
  }
}

Settings readSettings(int argc, char** argv) {
  Settings settings;
  for (int i = 1; i < argc; i += 2) {
    const std::string name = argv[i];
    const bool known =
        name.rfind("--", 0) == 0 && std::find(kOptions.begin(), kOptions.end(), name.substr(2)) != kOptions.end();
    if (!known || i + 1 == argc) giveUp("unknown option, or no value for it: " + name);
    settings[name.substr(2)] = argv[i + 1];
  }
  const auto file = settings.find("parameters");
  readParameters(file == settings.end() ? "parameters.txt" : file->second, settings);
  return settings;
}

double number(const Settings& settings, const std::string& name, double otherwise) {
  const auto found = settings.find(name);
  return found == settings.end() ? otherwise : std::strtod(found->second.c_str(), nullptr);
}

std::string text(const Settings& settings, const std::string& name, const std::string& otherwise) {
  const auto found = settings.find(name);
  return found == settings.end() ? otherwise : found->second;
}

void printBytes(long count) {
  std::string line(80, 'x');
  line.back() = '\n';
  for (; count > 0; count -= static_cast<long>(line.size())) {
    std::fwrite(line.data(), 1, static_cast<std::size_t>(std::min(count, static_cast<long>(line.size()))), stdout);
  }
  std::fflush(stdout);
}

void leaveGrandchild(const std::string& pidFile) {
  const pid_t child = fork();
  if (child == 0) {
    std::signal(SIGTERM, SIG_IGN);
    alarm(120);  // should nobody end it
    while (true) pause();
  }
  std::ofstream(pidFile) << child << '\n';
}

void sleepMilliseconds(double milliseconds) {
  timespec left{};
  left.tv_sec = static_cast<time_t>(milliseconds / 1000);
  left.tv_nsec = static_cast<long>((milliseconds - 1000.0 * static_cast<double>(left.tv_sec)) * 1e6);
  while (nanosleep(&left, &left) != 0) {
  }
}

/// The CSV text of `written` of the values, cut in mid-line for "half".
std::string results(const Settings& settings, double a, double b, double c) {
  const int steps = static_cast<int>(number(settings, "steps", 365));
  const std::string how = text(settings, "write", "all");
  std::string csv = "time,simulated\n";
  const int written = how == "empty" ? 0 : how == "half" ? steps / 2 : steps;
  for (int t = 0; t < written; ++t) {
    const double value = how == "nan" ? NAN : a + b * std::sin(t / 58.0) + c * t / 365.0;
    std::array<char, 80> line{};
    const std::chrono::year_month_day day =
        std::chrono::sys_days(std::chrono::January / 1 / 2001) + std::chrono::days(t);
    std::snprintf(line.data(), line.size(), how == "nan" ? "%04d-%02u-%02u,NaN\n" : "%04d-%02u-%02u,%.9g\n",
                  static_cast<int>(day.year()), static_cast<unsigned>(day.month()), static_cast<unsigned>(day.day()),
                  value);
    csv += line.data();
  }
  if (how == "half" && csv.size() > 20) csv.resize(csv.size() - 8);
  return csv;
}

void writeFile(const std::string& name, const std::string& content) {
  const int fd = open(name.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
  if (fd < 0 || write(fd, content.data(), content.size()) != static_cast<ssize_t>(content.size())) {
    giveUp("cannot write " + name);
  }
  close(fd);
}

}  // namespace

int main(int argc, char** argv) {
  const Settings settings = readSettings(argc, argv);
  const double a = number(settings, "a", 0);
  const double b = number(settings, "b", 0);
  const double c = number(settings, "c", 0);

  printBytes(static_cast<long>(number(settings, "print-bytes", 0)));
  if (settings.count("message") != 0) std::fprintf(stderr, "%s\n", text(settings, "message", "").c_str());
  if (number(settings, "close-output", 0) != 0) {
    close(1);
    close(2);
  }
  if (settings.count("grandchild") != 0) leaveGrandchild(text(settings, "grandchild", ""));
  if (number(settings, "ignore-term", 0) != 0) std::signal(SIGTERM, SIG_IGN);
  const double sleep = number(settings, "sleep-ms", 0);
  if (sleep > 0) sleepMilliseconds(sleep);
  if (a > number(settings, "fail-above", INFINITY)) {
    std::fprintf(stderr, "test_model: a = %g is too large\n", a);
    return 3;
  }
  if (a > number(settings, "crash-above", INFINITY)) std::abort();
  if (settings.count("signal") != 0) raise(static_cast<int>(number(settings, "signal", 0)));

  if (text(settings, "write", "all") != "nothing") {
    writeFile(text(settings, "output", "simulated.csv"), results(settings, a, b, c));
  }
  if (settings.count("measure") != 0) {
    std::array<char, 80> line{};
    std::snprintf(line.data(), line.size(), "%.17g\n%.17g\n", a, a * b);
    writeFile(text(settings, "measure", ""), line.data());
  }
  return static_cast<int>(number(settings, "exit-code", 0));
}

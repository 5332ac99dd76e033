// Tries faults on the built program: what the system refuses it, what is done to it from outside, and what an
// interrupted run leaves. Wanted each time: nothing lost that was reported as done, a message that names the file and
// the system's reason, no process left, and a setup that can be run again.
//
//   faults                       a fault a kind of file and call, for every build (two minutes)
//   faults --long                every call and error, hundreds of interruptions (many minutes)
//   faults [--long] GROUP ...    only these: injected, interruptions, ranks, real

#include <cstdio>
#include <set>
#include <string_view>

#include <fmt/format.h>

#include "faults/fault_report.h"

int main(int argc, char** argv) {
  using mirevo::testing::FaultReport;
  constexpr std::pair<std::string_view, void (*)(bool isLong, FaultReport& report)> kGroups[] = {
      {"injected", mirevo::testing::tryInjectedFaults},
      {"interruptions", mirevo::testing::tryInterruptions},
      {"ranks", mirevo::testing::tryLostRanks},
      {"real", mirevo::testing::tryRealFaults}};
  std::set<std::string_view> wanted(argv + 1, argv + argc);
  const bool isLong = wanted.erase("--long") > 0;
  FaultReport report;
  for (const bool isAll = wanted.empty(); const auto& [name, tryAll] : kGroups) {
    if (isAll || wanted.erase(name) > 0) tryAll(isLong, report);
  }
  if (wanted.empty()) return report.finish();
  fmt::print(stderr, "Usage: faults [--long] [injected] [interruptions] [ranks] [real]\n");
  return 2;
}

// Tries faults on the built program: what the system refuses it, what is done to it from outside, and what an
// interrupted run leaves. Wanted each time: nothing lost that was reported as done, a message that names the file and
// the system's reason, no process left, and a setup that can be run again.
//
//   faults                       a fault a kind of file and call, for every build (some seconds)
//   faults --long                every call and error, hundreds of interruptions (many minutes)
//   faults [--long] GROUP ...    only these: injected, interruptions, real

#include <algorithm>
#include <cstdio>
#include <iterator>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "faults/fault_report.h"
#include "faults/injected_faults.h"
#include "faults/interruptions.h"
#include "faults/real_faults.h"

int main(int argc, char** argv) {
  using mirevo::testing::FaultReport;
  struct Group {
    std::string_view name;
    void (*tryAll)(bool isLong, FaultReport& report);
  };
  constexpr Group kGroups[] = {{"injected", mirevo::testing::tryInjectedFaults},
                               {"interruptions", mirevo::testing::tryInterruptions},
                               {"real", mirevo::testing::tryRealFaults}};
  bool isLong = false;
  std::vector<std::string_view> wanted;
  for (int i = 1; i < argc; ++i) {
    const std::string_view argument = argv[i];
    if (argument == "--long") {
      isLong = true;
    } else if (std::ranges::find(kGroups, argument, &Group::name) != std::end(kGroups)) {
      wanted.push_back(argument);
    } else {
      fmt::print(stderr, "Usage: faults [--long] [injected] [interruptions] [real]\n");
      return 2;
    }
  }
  FaultReport report;
  for (const Group& group : kGroups) {
    bool isWanted = wanted.empty();
    for (const std::string_view name : wanted) isWanted = isWanted || name == group.name;
    if (isWanted) group.tryAll(isLong, report);
  }
  return report.finish();
}

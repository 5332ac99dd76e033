// reuse
//
// What it saves that a set is not run again, and what it costs. Prints
// - for searches of 200 evaluations over three integer parameters of 11, 6 and 6 values how many evaluations repeat an
//   earlier set, with the seeds 1, 2 and 3 (the final model run is not among them; a population that has converged ends
//   a search before),
// - the processor time of an evaluation that repeats another, by the whole program: of a search of 20,000 evaluations
// over these
//   396 sets,
// - processor time and memory of the look-up alone, for a million different sets of ten parameters.

#include <cstdio>
#include <malloc.h>
#include <sys/resource.h>

#include "common/data_table.h"
#include "evaluation/known_results.h"
#include "integration/model_folder.h"

namespace mirevo::testing {
namespace {

/// Processor time of this process, or of those that it has started and that have ended, which other load on the machine
/// hardly affects.
double processorSeconds(int who) {
  rusage usage{};
  ::getrusage(who, &usage);
  const auto seconds = [](const timeval& time) {
    return static_cast<double>(time.tv_sec) + 1e-6 * static_cast<double>(time.tv_usec);
  };
  return seconds(usage.ru_utime) + seconds(usage.ru_stime);
}

/// Three integer parameters: a in 0 to 10, b and c in 0 to 5.
class IntegerFolder : public ModelFolder {
 public:
  struct Count {
    int repeats = 0;
    int evaluations = 0;
  };
  /// Returns how many evaluations repeat another, without the final model run.
  Count run(const RunSettings& settings, int seed) const {
    const std::string setup = writeSetup(settings);
    editSetup("Upper_Bound = 10.0\n      Transformation_Type = 0", "Upper_Bound = 10.0\n      Transformation_Type = 2");
    editSetup("Upper_Bound = 5.0\n      Transformation_Type = 0", "Upper_Bound = 5.0\n      Transformation_Type = 2");
    editSetup("Upper_Bound = 5.0\n      Transformation_Type = 0\n      Parameter_Type = 1",
              "Upper_Bound = 5.0\n      Transformation_Type = 2\n      Parameter_Type = 0");
    editSetup("No_Loops_Convergence = 5", "No_Loops_Convergence = 1000");
    editSetup("Random_Seed = 1", fmt::format("Random_Seed = {}", seed));
    const ProgramResult result = runProgram({setup});
    if (result.exitCode != 0) throw std::runtime_error(result.error);
    const ReadTable table = readDataTable(read(settings.resultFile()));
    Count count{0, static_cast<int>(table.rows.size()) - 1};
    if (table.columns.back() != "Repeats") return count;
    for (const auto& row : table.rows) count.repeats += row.back() == "0" ? 0 : 1;
    return count;
  }
};

void countRepeats(const IntegerFolder& folder) {
  constexpr int kEvaluations = 200;
  std::printf("evaluations of %d that repeat an earlier set\n%-24s %8s %8s %8s\n", kEvaluations, "search", "seed 1",
              "seed 2", "seed 3");
  const std::tuple<const char*, int, bool> searches[] = {{"SCE", 0, false},
                                                         {"SCE, surrogate", 0, true},
                                                         {"PSE", 1, false},
                                                         {"PSE, surrogate", 1, true},
                                                         {"DDS", 2, false}};
  for (const auto& [name, algorithm, usesSurrogate] : searches) {
    std::printf("%-24s", name);
    for (int seed = 1; seed <= 3; ++seed) {
      const auto [repeats, evaluations] =
          folder.run({.algorithm = algorithm, .usesSurrogate = usesSurrogate, .maxEvaluations = kEvaluations}, seed);
      std::printf(" %8s", fmt::format("{}/{}", repeats, evaluations).c_str());
    }
    std::printf("\n");
  }
}

void timeRepeats(const IntegerFolder& folder) {
  constexpr int kFew = 2000;
  constexpr int kMany = 20'000;
  const auto secondsOf = [&folder](int evaluations) {
    const double start = processorSeconds(RUSAGE_CHILDREN);
    const int repeats = folder.run({.algorithm = 2, .maxEvaluations = evaluations}, 1).repeats;
    return std::pair(processorSeconds(RUSAGE_CHILDREN) - start, repeats);
  };
  const auto [few, fewRepeats] = secondsOf(kFew);
  const auto [many, manyRepeats] = secondsOf(kMany);
  std::printf("\nsearch of %d evaluations: %.2f s, %d repeats; of %d: %.2f s, %d repeats\n", kFew, few, fewRepeats,
              kMany, many, manyRepeats);
  std::printf("for each repeat that the longer one has more, at most %.0f us\n",
              (many - few) / (manyRepeats - fewRepeats) * 1e6);
}

void timeLookUp() {
  constexpr int kSets = 1'000'000;
  constexpr std::size_t kParameters = 10;
  SearchSpace space;
  space.names.assign(kParameters, "p");
  space.lower.assign(kParameters, 0.0);
  space.transformation.assign(kParameters, TransformationType::none);
  const ObjectiveAggregator aggregator({}, AggregationMethod::none);
  const auto before = ::mallinfo2();
  KnownResults known(space, aggregator);
  std::vector<double> set(kParameters, 0.5);
  const double first = processorSeconds(RUSAGE_SELF);
  for (int number = 1; number <= kSets; ++number) {
    set[0] = number;
    if (known.next(number, set).kind != KnownResults::Step::Kind::run) throw std::runtime_error("a new set is known");
    known.ended(number, set, true);
  }
  const double newSeconds = processorSeconds(RUSAGE_SELF) - first;
  const auto after = ::mallinfo2();
  const double again = processorSeconds(RUSAGE_SELF);
  for (int number = 1; number <= kSets; ++number) {
    set[0] = number;
    if (known.next(kSets + number, set).original != number) throw std::runtime_error("a set is not known");
  }
  std::printf("\nlook-up of a new set: %.2f us, of a known one: %.2f us; memory: %.0f bytes per evaluation\n",
              newSeconds / kSets * 1e6, (processorSeconds(RUSAGE_SELF) - again) / kSets * 1e6,
              static_cast<double>(after.uordblks + after.hblkhd - before.uordblks - before.hblkhd) / kSets);
}

}  // namespace
}  // namespace mirevo::testing

int main() {
  const mirevo::testing::IntegerFolder folder;
  mirevo::testing::countRepeats(folder);
  mirevo::testing::timeRepeats(folder);
  mirevo::testing::timeLookUp();
  return 0;
}

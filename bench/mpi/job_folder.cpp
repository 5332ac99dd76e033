// mpi_job_folder FOLDER RUNS MILLISECONDS
//
// Writes a model, its observations and `basin.kdx` into the folder: RUNS scenario runs of a model that sleeps for
// MILLISECONDS and computes next to nothing.

#include <cstdio>
#include <filesystem>

#include "integration/model_folder.h"

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fputs("Usage: mpi_job_folder FOLDER RUNS MILLISECONDS\n", stderr);
    return 1;
  }
  const mirevo::testing::ModelFolder folder;
  mirevo::testing::RunSettings settings{.option = 0};
  const int runs = std::atoi(argv[2]);
  for (int i = 1; i <= runs; ++i) settings.scenarios.push_back(fmt::format("{}, {}, 1", i % 10, i % 5));
  settings.modelArguments = fmt::format("--sleep-ms {}", argv[3]);
  folder.writeSetup(settings);
  std::filesystem::copy(folder.path(), argv[1],
                        std::filesystem::copy_options::recursive | std::filesystem::copy_options::overwrite_existing);
  return 0;
}

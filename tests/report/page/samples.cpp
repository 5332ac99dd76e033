// page_samples FOLDER: makes the reports that the page is tried with, a run of each task and kind of trouble, by the
// program; each becomes a file of its name in the folder.

#include "integration/model_folder.h"

int main(int argc, char** argv) {
  using namespace mirevo::testing;
  const std::pair<std::string, RunSettings> samples[] = {
      {"optimisation", {.algorithm = 0, .maxEvaluations = 120, .modelArguments = "--fail-above 9"}},
      {"short", {.maxEvaluations = 12}},
      {"uncertainty", {.option = 3, .maxEvaluations = 60, .modelArguments = "--fail-above 6"}},
      {"sensitivity", {.option = 1}},
      {"sobol", {.option = 1}},
      {"scenarios", {.option = 0, .scenarios = scenarios(30)}},
      {"allFailed", {.option = 0, .scenarios = scenarios(30), .modelArguments = "--fail-above -1"}}};
  if (argc != 2) return 2;
  for (const auto& [name, settings] : samples) {
    const ModelFolder folder;
    const std::string setup = folder.writeSetup(settings);
    if (name == "sobol") {
      folder.editSetup("Sensitivity_Type = 0",
                       "Sensitivity_Type = 'Sobol'\n[SOBOL]\nSample_Size = 64\nSecond_Order = 1\n[/SOBOL]");
    }
    runProgram({setup});
    std::filesystem::copy_file(folder / "basin_Report.html", std::string(argv[1]) + "/" + name);
  }
  return 0;
}

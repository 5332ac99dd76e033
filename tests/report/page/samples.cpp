// page_samples FOLDER: makes the reports that the page is tried with, a run of each task and kind of trouble, by the
// program; each becomes a file of its name in the folder.

#include "integration/model_folder.h"

int main(int argc, char** argv) {
  using namespace mirevo::testing;
  const std::pair<std::string, RunSettings> samples[] = {
      {"optimisation", {.algorithm = 0, .maxEvaluations = 120, .modelArguments = "--fail-above 9"}},
      {"short", {.maxEvaluations = 12}},
      {"uncertainty", {.option = 3, .maxEvaluations = 120, .modelArguments = "--fail-above 6"}},
      {"glue", {.option = 3, .maxEvaluations = 120, .modelArguments = "--fail-above 9.5"}},
      {"dream", {.option = 3, .maxEvaluations = 400, .modelArguments = "--fail-above 9.5"}},
      {"sensitivity", {.option = 1}},
      {"screening", {.option = 1}},
      {"sobol", {.option = 1}},
      {"scenarios", {.option = 0, .scenarios = scenarios(30)}},
      {"allFailed", {.option = 0, .scenarios = scenarios(30), .modelArguments = "--fail-above -1"}}};
  if (argc != 2) return 2;
  std::filesystem::create_directories(argv[1]);
  for (const auto& [name, settings] : samples) {
    const ModelFolder folder;
    const std::string setup = folder.writeSetup(settings);
    if (name == "screening") folder.editSetup("Sensitivity_Type = 0", "Sensitivity_Type = 'Morris'");
    if (name == "sobol") {
      folder.editSetup("Parameter_Type = 1", "Parameter_Type = 0");
      folder.editSetup("Sensitivity_Type = 0",
                       "Sensitivity_Type = 'Sobol'\n[SOBOL]\nSample_Size = 64\nSecond_Order = 1\n[/SOBOL]");
    }
    if (name == "glue" || name == "dream") {
      folder.editSetup("Uncertainty_Type = 1",
                       name == "glue" ? "Uncertainty_Type = 'GLUE'\n[GLUE]\nBehavioural_Threshold = 1\n[/GLUE]"
                                      : "Uncertainty_Type = 'DREAM'\n[DREAM]\nLikelihood = 'AR(1)'\n[/DREAM]");
      // Without distributions of their own, parameters are as likely anywhere between their bounds.
      const std::string text = folder.read("basin.kdx");
      folder.write("basin.kdx", text.substr(0, text.find("    [PARAMETER_1]\n      Mean_Value")) +
                                    text.substr(text.find("  [/UNCERTAINTY_ESTIMATION]")));
    }
    runProgram({setup});
    std::filesystem::copy_file(folder / "basin_Report.html", std::string(argv[1]) + "/" + name,
                               std::filesystem::copy_options::overwrite_existing);
  }
  return 0;
}

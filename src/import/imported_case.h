#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "import/import_notes.h"
#include "measures/objective_functions.h"
#include "parameters/model_parameter.h"

namespace mirevo {

/// An input file of the model and its template; relative to the model's folder, like all names of files here.
struct ImportedTemplate {
  std::string templateFile;
  std::string parameterFile;
  SourcePlace place;
};

/// An output file of the model and the instructions that read it.
struct ImportedOutput {
  std::string file;
  std::string instructionFile;
  SourcePlace place;
};

/// A number that instructions read.
struct ImportedMeasure {
  std::string name;
  std::string measurement;              ///< its name in the instruction file
  std::optional<double> observedValue;  ///< empty: the number itself is the measure
  double weight = 1.0;                  ///< of differences at or below 0
  double weightAbove = 1.0;
  std::string objective;  ///< empty: only reported
  SourcePlace place;
};

struct ImportedObjective {
  std::string name;
  FunctionType type = FunctionType::sumOfSquares;
  double weight = 1.0;
};

/// What the run is to do.
struct ImportedTask {
  std::string option = "optimisation";  ///< names as in a setup
  std::string algorithm = "DDS";
  std::int32_t evaluations = 1000;
  std::int32_t seed = 1;
  bool includesInitial = true;
  double perturbation = 0.2;  ///< r of DDS and PDDS
  std::int32_t candidates = 16;
  std::int32_t complexes = 0;  ///< of SCE; 0: the usual figures
  std::int32_t pointsOfComplex = 0;
  std::int32_t pointsOfSubcomplex = 0;
  std::int32_t evolutionSteps = 0;
  std::optional<std::int32_t> loopsOfConvergence;
  std::optional<double> leastChange;
  std::string differencing = "forward";
  std::optional<double> perturbedPartOfValue;  ///< of a sensitivity analysis; empty: the default
  double longestModelRun = 0.0;                ///< s
};

/// A calibration of another program in the terms of this one.
struct ImportedCase {
  std::string name;    ///< of the setup, without its ending
  std::string source;  ///< the file that it is made from, as given
  std::string title;
  std::string folder;  ///< the model's, from which it is copied
  std::vector<ModelParameter> parameters;
  std::vector<ImportedTemplate> templates;
  std::vector<ImportedOutput> outputs;
  std::vector<ImportedMeasure> measures;
  std::vector<ImportedObjective> objectives;
  std::vector<std::string> commands;            ///< lines of a shell, one after the other
  std::map<std::string, std::string> newFiles;  ///< to be written into the model's folder: content by name
  ImportedTask task;
  ImportNotes notes;

  /// The parameter of that name, whatever the case; null if there is none.
  const ModelParameter* parameter(std::string_view name) const;
  /// Adds an objective function if there is none of that name yet.
  void addObjective(const std::string& name, FunctionType type = FunctionType::sumOfSquares);
};

/// A parameter's name in an equation.
std::string nameInEquation(std::string_view name);

/// The text of the setup. File names are those of the model's folder `model` beside it.
std::string setupText(const ImportedCase& imported);

}  // namespace mirevo

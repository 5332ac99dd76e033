#pragma once

#include <initializer_list>
#include <string>
#include <string_view>

namespace mirevo::bench {

/// What a generated setup asks for.
struct ScaleSetup {
  int option = 2;
  int parameters = 4;
  std::string simulation = {};      ///< further lines of MIREVO_SIMULATION_OPTION: "Restart = 1\n"
  std::string measures = {};        ///< the measures, with their count; empty: one number that the model writes
  std::string parameterLines = {};  ///< further lines of each parameter
  std::string task;                 ///< the sections of the task
  std::string model = "echo 1 > result.txt\n";  ///< the commands of a shell script
};

/// A section with the parts of its content.
std::string section(std::string_view name, std::initializer_list<std::string_view> parts);
/// The line that says how many items a section has.
std::string itemCount(int count);

/// Writes the model into `folder`/base and the setup into `folder`/scale.kdx, whose path it returns.
std::string writeSetup(const std::string& folder, const ScaleSetup& setup);

/// A CSV file of hourly values from 2001 on, 87,600 of them unless it says otherwise.
void writeHourlySeries(const std::string& path, int series, int rows = 87'600);

/// A search by DDS with this budget.
std::string ddsSections(int budget);
/// An uncertainty analysis of so many sets.
std::string uncertaintySections(int sets, int parameters, std::string_view further = {});

/// Runs the built program with the setup and prints its time, its processor time with and without that of the model
/// runs, its peak memory, and the sizes of its largest files. Throws FatalError if it fails.
void measureProgram(std::string_view what, const std::string& setup);

}  // namespace mirevo::bench

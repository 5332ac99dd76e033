#include <cmath>
#include <cstdint>
#include <utility>

#include <fmt/format.h>

#include "common/calendar.h"
#include "run/new_setup.h"

namespace mirevo {
namespace {

constexpr char kSetup[] = R"([MIREVO_PARAMETERS]
   // What a run is for: 'optimisation', 'sensitivity', 'uncertainty' or 'scenarios'. "Mirevo --keyword Option"
   // explains this keyword, and any other one in the same way. File names are relative to the folder of this file.
   [MIREVO_SIMULATION_OPTION]
      Option = 'optimisation'
      Title  = 'A first calibration'

      // What runs the model. Each run works in a copy of this file's folder, which itself is never written to.
      [SIMBATCH]
         TqSEKdxListItemCount = 1
         [SIMBATCHITEM_1]
            BatchFileName = 'model/run.sh'
         [/SIMBATCHITEM_1]
      [/SIMBATCH]

      // The input file in which the model finds its parameters, and the template from which it is written.
      [SIMPARAM]
         TqSEKdxListItemCount = 1
         [SIMPARAMITEM_1]
            ParamFileName    = 'model/parameters.txt'
            TemplateFileName = 'model/parameters.tpl'
         [/SIMPARAMITEM_1]
      [/SIMPARAM]
   [/MIREVO_SIMULATION_OPTION]

   // What may be varied, and between which bounds. The count is that of the sections PARAMETER_1, PARAMETER_2 ...
   [MODEL_PARAMETERS]
      TqSEKdxListItemCount = 2
      [PARAMETER_1]
         Parameter_Name      = 'delay'           // days
         Initial_Value       = 5.0
         Lower_Bound         = 1.0
         Upper_Bound         = 100.0
         Transformation_Type = 'logarithmic'     // a factor of two counts the same everywhere
      [/PARAMETER_1]
      [PARAMETER_2]
         Parameter_Name = 'loss'                 // share of the rain
         Initial_Value  = 0.3
         Lower_Bound    = 0.0
         Upper_Bound    = 1.0
      [/PARAMETER_2]
      [INTERNAL_CONSTRAINTS]
      [/INTERNAL_CONSTRAINTS]
   [/MODEL_PARAMETERS]

   // What is compared. The first month lets the model forget the content with which it begins.
   [ObjectiveFunctions]
      Start_Date = 2001-02-01
      End_Date   = 2001-12-31
      [OUTPUT_MEASURES]
         TqSEKdxListItemCount = 1
         [MEASURE_1]
            Name           = 'RMSE of the flow'
            Statistic_Type = 'root mean square'
            Function_Name  = 'flow'
            [SIMULATION_FILE]
               File_Name = 'model/flow.csv'      // the model writes it; one of a run by hand must be there
            [/SIMULATION_FILE]
            [OBSERVATION_FILE]
               File_Name = 'data/flow.csv'
            [/OBSERVATION_FILE]
         [/MEASURE_1]
         [OUTPUT_MEASURE_FILE]
         [/OUTPUT_MEASURE_FILE]
      [/OUTPUT_MEASURES]
      [OBJECTIVE_FUNCTIONS]
         TqSEKdxListItemCount = 1
         [OBJECTIVE_1]
            Name = 'flow'
         [/OBJECTIVE_1]
      [/OBJECTIVE_FUNCTIONS]
   [/ObjectiveFunctions]

   [SAVE_OUTPUT_FILES]
   [/SAVE_OUTPUT_FILES]
   [SimultaneousSimulations]
   [/SimultaneousSimulations]

   // The search. The same seed gives the same result.
   [OPTIMISATION_ALGORITHM]
      Algorithm_Type = 'DDS'
      [DDS_CONTROL_PARAMETERS]
      [/DDS_CONTROL_PARAMETERS]
      [INITIAL_SAMPLE]
         Random_Seed = 1
      [/INITIAL_SAMPLE]
      [STOPPING_CRITERIA]
         Max_No_Evaluations = 100
      [/STOPPING_CRITERIA]
   [/OPTIMISATION_ALGORITHM]
[/MIREVO_PARAMETERS]
)";

constexpr char kBatch[] = R"(#!/bin/sh
# Runs the model: put the command of your own in the place of the last line. It is started in a copy of this folder.
set -e           # a command that fails ends this file, so that the failure is noticed
export LC_ALL=C  # decimal points, whatever the language of the terminal
awk -f reservoir.awk FS=' ' parameters.txt FS=',' rain.csv > flow.csv
)";

constexpr char kModel[] =
    R"(# A reservoir: rain, less the loss, fills it, and every day a constant share of its content flows out.
FNR == NR { parameter[$1] = $3; next }                # the first file: lines such as "delay = 5"
FNR == 1  { print "time,flow_mm"; storage = 20; next }
          {
            storage += (1 - parameter["loss"]) * $2
            flow = storage * (1 - exp(-1 / parameter["delay"]))
            storage -= flow
            printf "%s,%.4f\n", $1, flow
          }
)";

constexpr char kTemplate[] = "!\ndelay = !delay             !\nloss  = !loss              !\n";
constexpr char kParameters[] = "delay = 5\nloss  = 0.3\n";

/// A multiplicative congruential generator (Park and Miller 1988): the same data on every machine.
class Random final {
 public:
  double next() {
    state_ = state_ * 16807 % 2147483647;
    return static_cast<double>(state_) / 2147483647.0;
  }

 private:
  std::int64_t state_ = 12345;
};

/// The reservoir of the model.
class Reservoir final {
 public:
  /// `outflow`: 1 - exp(-1/delay), the share of the content that flows out in a day.
  Reservoir(double outflow, double loss) : outflow_(outflow), loss_(loss) {}

  /// The flow of the next day.
  double flowAfter(double rain) {
    storage_ += (1.0 - loss_) * rain;
    const double flow = storage_ * outflow_;
    storage_ -= flow;
    return flow;
  }

 private:
  double outflow_;
  double loss_;
  double storage_ = 20.0;
};

struct Series {
  std::string rain = "time,rain_mm\n";
  std::string observed = "time,flow_mm\n";
  std::string simulated = "time,flow_mm\n";
};

/// A year of rain, the flow with a delay of 9 days and a loss of 45 %, as a gauge that is wrong by up to 10 % measures
/// it, and what the model writes with the parameters as they stand in its folder.
Series makeSeries() {
  Series series;
  Random random;
  Reservoir real(0.10516068318563, 0.45);
  Reservoir model(0.18126924692202, 0.3);
  const std::int64_t first = secondNumber({2001, 1, 1});
  for (int day = 0; day < 365; ++day) {
    const std::string date = isoTime(first + day * std::int64_t{86400}).substr(0, 10);
    const double amount = random.next();
    // As the file has it, and so the model.
    const double rain = random.next() < 0.35 ? std::round(240.0 * amount * amount) / 10.0 : 0.0;
    series.rain += fmt::format("{},{:.1f}\n", date, rain);
    series.observed += fmt::format("{},{:.2f}\n", date, real.flowAfter(rain) * (0.9 + 0.2 * random.next()));
    series.simulated += fmt::format("{},{:.4f}\n", date, model.flowAfter(rain));
  }
  return series;
}

}  // namespace

std::vector<NewFile> newSetupFiles() {
  Series series = makeSeries();
  return {{"setup.kdx", "the setup, with comments: begin here", kSetup},
          {"data/flow.csv", "the observations", std::move(series.observed)},
          {"model/run.sh", "runs the model", kBatch, 0777},
          {"model/reservoir.awk", "the model, in the place of yours", kModel},
          {"model/rain.csv", "its input", std::move(series.rain)},
          {"model/parameters.tpl", "the template of its parameters", kTemplate},
          {"model/parameters.txt", "its parameters, written from the template before each run", kParameters},
          {"model/flow.csv", "its output, as a run by hand leaves it", std::move(series.simulated)}};
}

}  // namespace mirevo

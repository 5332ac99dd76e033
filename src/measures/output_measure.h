#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "common/date_record.h"
#include "common/settings/code_name.h"
#include "measures/listing_settings.h"
#include "measures/observation_selection.h"
#include "measures/observation_weights.h"
#include "measures/time_match.h"
#include "platform/series/text_form.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

enum class InterfaceType : std::int32_t { timeSeries = 0, measureFile = 1 };
inline constexpr CodeName kInterfaceTypeNames[] = {{0, "time series"}, {1, "measure file"}};

/// A statistic by its index in the table of statistics (measures/statistics.h), which is also the code of those that
/// have one.
enum class StatisticType : std::int32_t {
  mean = 0,
  rootMeanSquare = 1,
  standardDeviation = 2,
  peakDifference = 3,
  lowDifference = 4
};

/// What is done with both values of a pair before a statistic is computed.
enum class ValueTransformation : std::int32_t { none, logarithm, squareRoot, inverse, boxCox, rank };
/// Without codes: names only, in the order of the enumerators.
inline constexpr CodeName kValueTransformationNames[] = {{std::nullopt, "none"},        {std::nullopt, "logarithm"},
                                                         {std::nullopt, "square root"}, {std::nullopt, "inverse"},
                                                         {std::nullopt, "Box-Cox"},     {std::nullopt, "rank"}};

/// The transformation with this name, in any letter case.
std::optional<ValueTransformation> findTransformation(std::string_view name);

class ListingForm;

/// One item of a time-series file.
struct SeriesReference {
  std::string fileName;  ///< absolute; trailing blanks trimmed
  std::int32_t itemNo = 1;
  std::string itemName = {};  ///< as the setup has it; empty: the number tells the item
  /// What begins the detail of an error in the file name or in the item, "setup.kdx:75:23: File_Name: "; empty if it is
  /// not known.
  std::string fileLocation = {};
  std::string itemLocation = {};
  bool isDefaultItem = false;     ///< the setup does not say which item
  bool hasItemNo = false;         ///< the number is known, which may be beside the name
  bool isOfModel = false;         ///< the model writes the file
  TextForm form = {};             ///< of a text file
  std::string formLocation = {};  ///< likewise, of the first keyword that tells the form
  ListingSettings listingSettings = {};
  /// What of the file, which is then a listing, are series; the same object for equal settings. Null: a series file.
  std::shared_ptr<const ListingForm> listing = {};
};

/// A comparison of a simulated with an observed series, reduced to one number, or a number that the model wrote.
struct OutputMeasure {
  std::string name;
  InterfaceType interfaceType = InterfaceType::timeSeries;
  std::int32_t measurementNo = 1;    ///< which number of the output-measure file, from 1
  std::string measureFile = {};      ///< that has the number, if it is not the first one
  std::string measurementName = {};  ///< its name in the instruction file; empty: it is told by the number
  /// With it a measure that the model wrote is the weighted difference of the number to this; empty: the number itself.
  std::optional<double> observedValue = {};
  StatisticType statisticType = StatisticType::mean;
  ValueTransformation transformation = ValueTransformation::none;
  std::optional<double> epsilon;  ///< added to the values before a logarithm, inverse or power; empty: of the default
  double boxCoxLambda = 0.25;     ///< exponent of the Box-Cox transformation; 0: the logarithm
  /// Of differences where the simulation is at or below the observation; of a statistic without a code, of its
  /// contribution to the objective function.
  double weight = 1.0;
  double weightAbove = 1.0;    ///< of differences where it is above
  std::string functionName;    ///< the objective function that it belongs to; empty: none
  SeriesReference simulation;  ///< in or below the base folder
  SeriesReference observation;
  ObservationWeighting weighting = {};  ///< of the observations
  ObservationSelection selection = {};
  TimeMatching timeMatch = {};
  SeriesReference shownAbove = {};  ///< drawn above the hydrograph; without a file name: none
  std::string displayName = {};     ///< of the quantity, for people; empty: the name of the observed item
  std::string unit = {};            ///< of the values; empty: as the observed file says

  /// Of a number that the model wrote, the value of the measure.
  double valueOf(double number) const {
    if (!observedValue) return number;
    const double difference = number - *observedValue;
    return (difference > 0.0 ? weightAbove : weight) * difference;
  }
};

/// Values of series in 32 bits, as the statistics of a run use them, or with all digits of their file.
enum class SeriesPrecision { single, exact };

/// Which observations count.
struct EvaluationPeriod {
  DateRecord start{};
  DateRecord end{};
  /// Those between two simulated steps farther apart than this have no simulated value; 0: interpolated over any gap.
  double largestGapHours = 0.0;
  double warmUpDays = 0.0;  ///< from the start on, in which observations count for no measure

  double largestGapDays() const { return largestGapHours > 0.0 ? largestGapHours / 24.0 : kAnyGap; }
};

}  // namespace mirevo

#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "platform/series/file_parts.h"
#include "platform/series/gathered_series.h"

namespace mirevo {

/// Series in XML: WaterML 1.1 (CUAHSI's schema, and the services of the USGS), WaterML 2.0 time series (OGC 10-126r4:
/// time-value pairs, "MeasurementTVP") and PI-XML (Deltares, "Delft-FEWS Published Interface: timeseries", schema
/// pi_timeseries.xsd). The root element tells which. One item for each of their series, in file order, and after it its
/// qualifiers, censoring or flags as quality codes, if it has any. The file is read a part at a time (XmlSplitter),
/// times and values are kept.
class XmlTimeSeries final : public GatheredSeries {
 public:
  explicit XmlTimeSeries(std::shared_ptr<SeriesReading> reading = nullptr) : GatheredSeries(std::move(reading)) {}

 private:
  class Reader;
  bool read(FileParts& parts) override;
};

}  // namespace mirevo

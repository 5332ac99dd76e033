#include "platform/series/xml_time_series.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <optional>
#include <pugixml.hpp>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/text.h"
#include "platform/series/file_zone.h"
#include "platform/series/quality_codes.h"
#include "platform/series/series_reading.h"
#include "platform/series/xml_splitter.h"

namespace mirevo {
namespace {

constexpr double kNone = std::numeric_limits<double>::quiet_NaN();

/// The attribute of this name, whatever its prefix; empty text without one.
std::string_view attribute(const pugi::xml_node& node, std::string_view name) {
  for (const pugi::xml_attribute& each : node.attributes()) {
    if (localName(each.name()) == name) return trim(each.value());
  }
  return {};
}

/// The first child of this name, whatever its prefix.
pugi::xml_node child(const pugi::xml_node& node, std::string_view name) {
  return node.find_child([name](const pugi::xml_node& each) { return localName(each.name()) == name; });
}

/// The first element of this name anywhere below.
pugi::xml_node below(const pugi::xml_node& node, std::string_view name) {
  return node.find_node([name](const pugi::xml_node& each) { return localName(each.name()) == name; });
}

std::string_view textOf(const pugi::xml_node& node) {
  return trim(node.child_value());
}

pugi::xml_node ancestor(pugi::xml_node node, std::string_view name) {
  while (node && localName(node.name()) != name) node = node.parent();
  return node;
}

std::string_view firstOf(std::initializer_list<std::string_view> texts) {
  for (const std::string_view text : texts) {
    if (!text.empty()) return text;
  }
  return {};
}

/// One point as it is written.
struct Point {
  std::string time;
  std::string_view value;
  std::string qualifiers = {};  ///< for qualityCode()
  std::string_view flag = {};   ///< a code that is a number
  bool isEmpty = false;         ///< without a time: passed over
};

struct Description {
  std::string name;
  std::string unit = {};
  std::optional<double> noData = {};
  double defaultCode = kNone;  ///< of points without a code
};

/// How one of the formats is to be read.
struct Dialect {
  std::string_view format;
  XmlSplitter::Names names;
  std::string_view codeName;  ///< behind the name of the item
  Point (*point)(const pugi::xml_node& point);
  Description (*describe)(const pugi::xml_node& container);
};

// PI-XML -------------------------------------------------------------------------------------------------------------

Point pointOfPi(const pugi::xml_node& event) {
  Point point{.time = fmt::format("{}T{}", attribute(event, "date"), attribute(event, "time")),
              .value = attribute(event, "value"),
              .flag = attribute(event, "flag")};
  if (attribute(event, "time").empty()) point.time.pop_back();
  return point;
}

Description describePi(const pugi::xml_node& series) {
  const pugi::xml_node header = child(series, "header");
  Description description{
      .name = fmt::format("{} {}", textOf(child(header, "locationId")), textOf(child(header, "parameterId")))};
  for (const char* more : {"qualifierId", "ensembleMemberIndex", "ensembleMemberId"}) {
    for (const pugi::xml_node& each : header.children()) {
      if (localName(each.name()) == more) description.name += fmt::format(" {}", textOf(each));
    }
  }
  description.unit = textOf(child(header, "units"));
  description.noData = parseReal(textOf(child(header, "missVal")));
  return description;
}

// WaterML 1.1 --------------------------------------------------------------------------------------------------------

Point pointOfWaterMl1(const pugi::xml_node& value) {
  Point point{.time = std::string(attribute(value, "dateTime")),
              .value = textOf(value),
              .qualifiers = std::string(attribute(value, "qualifiers"))};
  const std::string_view censored = attribute(value, "censorCode");
  if (censored == "lt") point.qualifiers += " <";
  if (censored == "gt") point.qualifiers += " >";
  const auto time = parseZonedTime(point.time);
  if (time && !time->offsetMinutes) point.time += attribute(value, "timeOffset");
  return point;
}

Description describeWaterMl1(const pugi::xml_node& values) {
  const pugi::xml_node series = ancestor(values, "timeSeries");
  const pugi::xml_node variable = child(series, "variable");
  const pugi::xml_node unit = child(variable, "unit");
  Description description{
      .name = fmt::format("{} {}", textOf(child(child(series, "sourceInfo"), "siteCode")),
                          firstOf({textOf(child(variable, "variableCode")), textOf(child(variable, "variableName"))}))};
  const std::string_view statistic = attribute(below(variable, "option"), "optionCode");
  if (!statistic.empty()) description.name += fmt::format(" {}", statistic);
  const auto isValues = [](const pugi::xml_node& each) { return localName(each.name()) == "values"; };
  const auto siblings = series.children();
  const pugi::xml_node method = child(values, "method");
  if (method && std::count_if(siblings.begin(), siblings.end(), isValues) > 1) {
    description.name +=
        fmt::format(" [{}]", firstOf({attribute(method, "methodID"), textOf(child(method, "methodCode"))}));
  }
  description.unit = firstOf(
      {textOf(child(unit, "unitCode")), textOf(child(unit, "unitAbbreviation")), textOf(child(unit, "unitName"))});
  // Codes of units are often numbers, of which nothing can be read.
  if (parseReal(description.unit)) {
    description.unit = firstOf({textOf(child(unit, "unitAbbreviation")), textOf(child(unit, "unitName"))});
  }
  description.noData = parseReal(textOf(child(variable, "noDataValue")));
  return description;
}

// WaterML 2.0 --------------------------------------------------------------------------------------------------------

std::string qualifiersOf(const pugi::xml_node& metadata) {
  std::string qualifiers;
  for (const pugi::xml_node& each : metadata.children()) {
    if (localName(each.name()) != "qualifier") continue;
    qualifiers += fmt::format("{} ", textOf(below(each, "value")));
  }
  const std::string_view censored = attribute(child(metadata, "censoredReason"), "href");
  if (!censored.empty()) qualifiers += censored.ends_with("AboveRange") || censored.ends_with("above") ? '>' : '<';
  return qualifiers;
}

Point pointOfWaterMl2(const pugi::xml_node& node) {
  const pugi::xml_node pair = child(node, "MeasurementTVP");
  return {.time = std::string(textOf(child(pair, "time"))),
          .value = textOf(child(pair, "value")),
          .qualifiers = qualifiersOf(child(child(pair, "metadata"), "TVPMeasurementMetadata")),
          .isEmpty = textOf(child(pair, "time")).empty() && textOf(child(pair, "value")).empty()};
}

std::string_view lastPart(std::string_view reference) {
  return reference.substr(reference.find_last_of("/#:=") + 1);
}

Description describeWaterMl2(const pugi::xml_node& series) {
  const pugi::xml_node observation = ancestor(series, "OM_Observation");
  const pugi::xml_node feature = child(observation, "featureOfInterest");
  const pugi::xml_node property = child(observation, "observedProperty");
  const pugi::xml_node defaults = below(child(series, "defaultPointMetadata"), "DefaultTVPMeasurementMetadata");
  const pugi::xml_node unit = child(defaults, "uom");
  const std::string_view place =
      firstOf({attribute(feature, "title"), textOf(below(feature, "identifier")), lastPart(attribute(feature, "href")),
               attribute(observation, "id"), attribute(series, "id")});
  const std::string_view what = firstOf({attribute(property, "title"), lastPart(attribute(property, "href"))});
  return {.name = fmt::format("{}{}{}", place, what.empty() ? "" : ": ", what),
          .unit = std::string(
              firstOf({attribute(unit, "code"), attribute(unit, "title"), lastPart(attribute(unit, "href"))})),
          .defaultCode = qualityCode(qualifiersOf(defaults))};
}

constexpr Dialect kDialects[] = {
    {"PI-XML", {"series", "event"}, " flag", pointOfPi, describePi},
    {"WaterML 1.1", {"values", "value"}, " quality", pointOfWaterMl1, describeWaterMl1},
    {"WaterML 2.0", {"MeasurementTimeseries", "point"}, " quality", pointOfWaterMl2, describeWaterMl2},
};

const Dialect* dialectOf(std::string_view root) {
  if (root == "TimeSeries") return &kDialects[0];
  if (equalIgnoringCase(root, "timeSeriesResponse")) return &kDialects[1];
  for (const char* name : {"Collection", "OM_Observation", "GetObservationResponse", "MeasurementTimeseries"}) {
    if (root == name) return &kDialects[2];
  }
  return nullptr;
}

}  // namespace

/// What is read of a file, a part at a time.
class XmlTimeSeries::Reader final {
 public:
  XmlSplitter::Names begin(std::string_view root) {
    dialect_ = dialectOf(root);
    if (dialect_ != nullptr) return dialect_->names;
    fault_ = fmt::format(
        "expected WaterML 1.1 (timeSeriesResponse), WaterML 2.0 (Collection) or PI-XML (TimeSeries), found the element "
        "{}",
        quotedForMessage(root));
    return {};
  }

  bool take(std::size_t container, const std::string& text, std::size_t line) {
    if (read_.size() <= container) read_.resize(container + 1);
    const std::string points = decodeText(text).text;
    const auto lineAt = [&](std::ptrdiff_t offset) {
      const auto end =
          points.begin() + std::clamp<std::ptrdiff_t>(offset, 0, static_cast<std::ptrdiff_t>(points.size()));
      faultLine_ = line + static_cast<std::size_t>(std::count(points.begin(), end, '\n'));
    };
    pugi::xml_document document;
    const pugi::xml_parse_result result = document.load_buffer(
        points.data(), points.size(), pugi::parse_default | pugi::parse_fragment, pugi::encoding_utf8);
    if (!result) {
      fault_ = fmt::format("it is no valid XML: {}", result.description());
      lineAt(result.offset);
      return false;
    }
    for (const pugi::xml_node& each : document.children()) {
      if (each.type() != pugi::node_element || takePoint(each, read_[container])) continue;
      lineAt(each.offset_debug());
      return false;
    }
    return true;
  }

  /// The items, of what the outline says of the containers in its order.
  bool finish(const std::string& outline, std::vector<Seconds>& axes, std::vector<Column>& columns) {
    const std::string text = decodeText(outline).text;
    pugi::xml_document document;
    const pugi::xml_parse_result result =
        document.load_buffer(text.data(), text.size(), pugi::parse_default, pugi::encoding_utf8);
    if (!result) {
      fault_ = fmt::format("it is no valid XML: {}", result.description());
      return false;
    }
    std::size_t container = 0;
    for (pugi::xml_node node = document.first_child(); node; node = next(node)) {
      if (localName(node.name()) != dialect_->names.container) continue;
      if (read_.size() <= container) read_.resize(container + 1);
      describe(dialect_->describe(node), read_[container++], axes, columns);
    }
    if (container > 0) return true;
    fault_ = fmt::format("expected a series ({}) in {}, found none", dialect_->names.container, dialect_->format);
    return false;
  }

  const std::string& fault() const { return fault_; }
  std::size_t faultLine() const { return faultLine_; }  ///< 0: where the splitter is
  std::string doubt() const { return zone_.doubt(); }

 private:
  struct Read {
    Seconds seconds;
    std::vector<double> values;
    std::vector<double> codes;
  };

  /// The element that follows in document order.
  static pugi::xml_node next(pugi::xml_node node) {
    if (node.first_child()) return node.first_child();
    while (node && !node.next_sibling()) node = node.parent();
    return node.next_sibling();
  }

  bool refuse(std::string_view expected, std::string_view found) {
    fault_ = fmt::format("expected {}, found {}", expected, quotedForMessage(found));
    return false;
  }

  bool takePoint(const pugi::xml_node& node, Read& read) {
    const Point point = dialect_->point(node);
    if (point.isEmpty) return true;
    const auto time = parseZonedTime(point.time);
    if (!time) return refuse("a valid time like 2001-01-31T12:30:00", point.time);
    const auto second = zone_.take(*time);
    if (!second) return refuse("times that all have an offset from UTC, or none", point.time);
    if (!read.seconds.empty() && *second <= read.seconds.back()) {
      return refuse("a time later than that of the point before", point.time);
    }
    const auto value = parseReal(point.value);
    const bool isMissing = point.value.empty() || equalIgnoringCase(point.value, "nan");
    if (!isMissing && (!value || std::isinf(static_cast<float>(*value)))) return refuse("a number", point.value);
    const auto flag = parseReal(point.flag);
    if (!point.flag.empty() && !flag) return refuse("a flag that is a number", point.flag);
    read.seconds.push_back(*second);
    read.values.push_back(value.value_or(kNone));
    read.codes.push_back(flag ? *flag : qualityCode(point.qualifiers));
    return true;
  }

  void describe(const Description& description, Read& read, std::vector<Seconds>& axes, std::vector<Column>& columns) {
    bool hasCodes = false;
    for (double& value : read.values) {
      if (description.noData && value == *description.noData) value = kNone;
    }
    for (double& code : read.codes) {
      if (std::isnan(code)) code = description.defaultCode;
      hasCodes = hasCodes || !std::isnan(code);
    }
    for (std::int64_t& second : read.seconds) second += zone_.shiftSeconds();
    const std::string name(trim(onOneLine(description.name)));
    columns.push_back({.name = name.empty() ? fmt::format("series {}", axes.size() + 1) : name,
                       .unit = onOneLine(description.unit),
                       .axis = axes.size(),
                       .values = std::move(read.values)});
    if (hasCodes) {
      columns.push_back({.name = columns.back().name + std::string(dialect_->codeName),
                         .axis = axes.size(),
                         .values = std::move(read.codes)});
    }
    axes.push_back(std::move(read.seconds));
  }

  const Dialect* dialect_ = nullptr;
  FileZone zone_;
  std::vector<Read> read_;  ///< one per container
  std::string fault_;
  std::size_t faultLine_ = 0;
};

bool XmlTimeSeries::read(FileParts& parts) {
  Reader reader;
  XmlSplitter splitter([&](std::string_view root) { return reader.begin(root); },
                       [&](std::size_t container, const std::string& points, std::size_t line) {
                         return reader.take(container, points, line);
                       });
  bool isSound = true;
  bool isFirst = true;
  while (isSound) {
    const std::string_view bytes = parts.next();
    if (!parts.fault().empty()) return failToRead(parts.fault());
    if (bytes.empty()) break;
    if (std::exchange(isFirst, false) && isUtf16(bytes)) {
      lastError_ = fmt::format("{}: {}", sourceName_, faultOfEncoding(bytes));
      return false;
    }
    isSound = splitter.take(bytes);
  }
  isSound = isSound && splitter.finish();
  std::vector<Seconds> axes;
  std::vector<Column> columns;
  if (isSound && reader.finish(splitter.outline(), axes, columns)) {
    if (const std::string doubt = reader.doubt(); !doubt.empty()) doubts_.push_back(sourceName_ + ": " + doubt);
    gather(axes, std::move(columns));
    return true;
  }
  lastError_ = fmt::format("{}:{}: {}", sourceName_, reader.faultLine() == 0 ? splitter.line() : reader.faultLine(),
                           reader.fault().empty() ? splitter.fault() : reader.fault());
  return false;
}

}  // namespace mirevo

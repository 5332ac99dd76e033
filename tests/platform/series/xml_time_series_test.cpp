#include "platform/series/xml_time_series.h"

#include <string>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/format_samples.h"
#include "platform/series/shown_values.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

std::string pi(const std::string& series) {
  return "<?xml version=\"1.0\"?>\n<TimeSeries xmlns=\"http://www.wldelft.nl/fews/PI\">\n<timeZone>1.0</timeZone>" +
         series + "</TimeSeries>\n";
}

std::string piSeries(const std::string& location, const std::string& events) {
  return "<series><header><locationId>" + location +
         "</locationId><parameterId>H</parameterId><missVal>-999.0</missVal><units>m</units></header>\n" + events +
         "</series>";
}

std::string waterMl1(const std::string& values) {
  return "<n:timeSeriesResponse xmlns:n=\"http://www.cuahsi.org/waterML/1.1/\"><n:timeSeries><n:sourceInfo>"
         "<n:siteCode network=\"N\">7</n:siteCode></n:sourceInfo><n:variable><n:variableCode>00060</n:variableCode>"
         "<n:unit><n:unitCode>35</n:unitCode><n:unitAbbreviation>cfs</n:unitAbbreviation></n:unit>"
         "<n:noDataValue>-9999</n:noDataValue></n:variable>" +
         values + "</n:timeSeries></n:timeSeriesResponse>";
}

std::string waterMl2(const std::string& metadata, const std::string& points) {
  return "<w:Collection xmlns:w=\"http://www.opengis.net/waterml/2.0\"><w:observationMember><om:OM_Observation>"
         "<om:observedProperty xlink:title=\"Discharge\"/><om:featureOfInterest xlink:title=\"River\"/><om:result>"
         "<w:MeasurementTimeseries><w:defaultPointMetadata><w:DefaultTVPMeasurementMetadata>" +
         metadata + "<w:uom code=\"m3/s\"/></w:DefaultTVPMeasurementMetadata></w:defaultPointMetadata>" + points +
         "</w:MeasurementTimeseries></om:result></om:OM_Observation></w:observationMember></w:Collection>";
}

std::string point(const std::string& content) {
  return "<w:point><w:MeasurementTVP>" + content + "</w:MeasurementTVP></w:point>";
}

TEST(XmlTimeSeries, ReadsPiXmlWithItsFlags) {
  XmlTimeSeries series;
  const std::string a =
      piSeries("A",
               "<event date=\"2012-10-18\" time=\"06:00:00\" value=\"-0.142\" flag=\"0\"/>\n"
               "<!-- <event> --><event date=\"2012-10-18\" time=\"24:00:00\" value=\"-999.0\" flag=\"9\"/>");
  const std::string b = piSeries("B &amp; C", "<event date=\"2012-10-18\" time=\"18:00:00\" value='5'>\n</event>");
  ASSERT_TRUE(series.parse("h.xml", pi(a + piSeries("none", "") + b))) << series.lastError();
  EXPECT_EQ(formatDate(series.startTime().value()), "2012-10-18 06:00");
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, 0.5, 0.75));
  ASSERT_EQ(series.itemCount(), 4);
  EXPECT_EQ(series.itemName(1) + ", " + series.itemUnit(1), "A H, m");
  EXPECT_EQ(series.itemName(2) + ", " + series.itemUnit(2), "A H flag, ");
  EXPECT_EQ(series.itemName(4), "B & C H");
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(-0.142F, -999999.0F, -999999.0F));
  EXPECT_THAT(valuesOf(series, 2), ElementsAre(0.0F, -999999.0F, 9.0F));
  EXPECT_THAT(valuesOf(series, 3), ElementsAre(-999999.0F, -999999.0F, -999999.0F));
  EXPECT_THAT(valuesOf(series, 4), ElementsAre(-999999.0F, 5.0F, -999999.0F));
}

TEST(XmlTimeSeries, ReadsWaterMl1) {
  XmlTimeSeries series;
  const std::string values =
      "<n:values><n:value qualifiers=\"P e\" dateTime=\"2012-11-04T01:30:00.000-04:00\">83</n:value>"
      "<n:value censorCode=\"lt\" dateTime=\"2012-11-04T01:30:00\" timeOffset=\"-05:00\">0.5</n:value>"
      "<n:value dateTime=\"2012-11-04T02:30:00.000-05:00\">-9999.0</n:value>";
  ASSERT_TRUE(series.parse("q.xml", waterMl1(values + "<n:method methodID=\"1\"/></n:values>"))) << series.lastError();
  EXPECT_EQ(formatDate(series.startTime().value()), "2012-11-04 00:30");
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, DoubleEq(1.0 / 24), DoubleEq(2.0 / 24)));
  EXPECT_EQ(series.itemName(1) + ", " + series.itemUnit(1), "7 00060, cfs");
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(83.0F, 0.5F, -999999.0F));
  EXPECT_THAT(valuesOf(series, 2), ElementsAre(12.0F, 20.0F, -999999.0F));
  EXPECT_THAT(series.doubts(), ElementsAre("q.xml: its times change between UTC-05:00 and UTC-04:00, and are all read "
                                           "in UTC-05:00"));
  const std::string second = "<n:values><n:method methodID=\"2\"/></n:values>";
  ASSERT_TRUE(series.parse("q.xml", waterMl1(values + "<n:method methodID=\"1\"/></n:values>" + second)));
  EXPECT_EQ(series.itemName(1) + "; " + series.itemName(3), "7 00060 [1]; 7 00060 [2]");
}

TEST(XmlTimeSeries, ReadsWaterMl2WithTheQualifierOfAllPointsOrOfEach) {
  XmlTimeSeries series;
  const auto qualifier = [](const std::string& code) {
    return "<w:qualifier><swe:Category><swe:value>" + code + "</swe:value></swe:Category></w:qualifier>";
  };
  const std::string points = point("<w:metadata/>") + point("<w:time>2014-09-01</w:time><w:value>2.5</w:value>") +
                             point("<w:time>2014-09-02</w:time><w:value/><w:metadata><w:TVPMeasurementMetadata>" +
                                   qualifier("A") + qualifier("e") + "</w:TVPMeasurementMetadata></w:metadata>");
  ASSERT_TRUE(series.parse("q.xml", waterMl2(qualifier("P"), points))) << series.lastError();
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, 1.0));
  EXPECT_EQ(series.itemName(1) + ", " + series.itemUnit(1), "River: Discharge, m3/s");
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(2.5F, -999999.0F));
  EXPECT_THAT(valuesOf(series, 2), ElementsAre(2.0F, 11.0F));
  ASSERT_TRUE(series.parse("q.xml", waterMl2("", point("<w:time>2014-09-01</w:time><w:value>2.5</w:value>"))));
  EXPECT_EQ(series.itemCount(), 1);
}

TEST(XmlTimeSeries, RefusesWithThePlaceAndWhatWasExpected) {
  const std::string event = "<event date=\"2012-10-18\" time=\"06:00:00\" value=\"1\"/>\n";
  const std::tuple<std::string, std::string> cases[] = {
      {"", "1: expected an XML document, found the end of the file"},
      {"time,Q\n", "2: expected an XML document, found \"time,Q?\""},
      {"<html></html>",
       "1: expected WaterML 1.1 (timeSeriesResponse), WaterML 2.0 (Collection) or PI-XML (TimeSeries), found the "
       "element \"html\""},
      {"<!DOCTYPE a [<!ENTITY b \"c\">]><a/>", "1: expected a document without a document type (<!DOCTYPE), found one"},
      {pi(""), "4: expected a series (series) in PI-XML, found none"},
      {pi("<series></header>"), "3: expected </series>, found \"</header>\""},
      {pi("\n<series>\n<event value=\"1\n"), "7: expected </series>, found the end of the file"},
      {pi(piSeries("A", event + "<event date=\"2012-10-18\" time=\"25:00:00\" value=\"1\"/>")),
       "5: expected a valid time like 2001-01-31T12:30:00, found \"2012-10-18T25:00:00\""},
      {pi(piSeries("A", event + "\n<!--\n-->" + event)),
       "7: expected a time later than that of the point before, found \"2012-10-18T06:00:00\""},
      {pi(piSeries("A", "<event date=\"2012-10-18\" time=\"06:00:00\"\nvalue=\"x\"/>")),
       "4: expected a number, found \"x\""},
      {pi(piSeries("A", "<event date=\"2012-10-18\" value=\"1\" flag=\"good\"/>")),
       "4: expected a flag that is a number, found \"good\""},
      {pi(piSeries("A", "<event date==\"2012-10-18\"/>")), "4: it is no valid XML: Error parsing element attribute"},
      {waterMl1("<n:values><n:value dateTime=\"2012-05-12T01:00:00Z\">1</n:value>"
                "<n:value dateTime=\"2012-05-12T02:00:00\">1</n:value></n:values>"),
       "1: expected times that all have an offset from UTC, or none, found \"2012-05-12T02:00:00\""},
      {std::string("<\0T\0", 4),
       " the file is UTF-16 text; save it as UTF-8, for example with iconv -f UTF-16 -t UTF-8"},
  };
  for (const auto& [content, error] : cases) {
    XmlTimeSeries series;
    EXPECT_FALSE(series.parse("s.xml", content)) << content;
    EXPECT_EQ(series.lastError(), "s.xml:" + error);
    EXPECT_EQ(series.timeStepCount() + series.itemCount(), 0);
  }
  // Cut off anywhere, it is refused.
  const std::string whole = pi(piSeries("A", event));
  for (std::size_t length = 0; length + 1 < whole.size(); ++length) {
    XmlTimeSeries series;
    EXPECT_FALSE(series.parse("s.xml", whole.substr(0, length))) << length;
  }
}

TEST(XmlTimeSeries, ReadsAFileOfManyPartsAsOne) {
  const TemporaryFolder folder;
  std::string events;
  constexpr int kDays = 20000;
  for (int i = 0; i < kDays; ++i) {
    const DateRecord date = dateOfSecond(dayNumber(1950, 1, 1) * kSecondsOfDay + i * kSecondsOfDay);
    events += "  <event date=\"" + formatDate(date).substr(0, 10) + "\" time=\"00:00:00\" comment=\"" +
              std::string(80, 'x') + "\" value=\"" + std::to_string(i) + "\"/>\n";
  }
  std::string reason;
  const std::string path = folder.write("h.xml", pi(piSeries("A", events) + piSeries("B", events)));
  const auto series = createTimeSeriesObject(path, reason);
  ASSERT_TRUE(series->open(path)) << series->lastError();
  EXPECT_EQ(series->timeStepCount(), kDays);
  for (const int item : {1, 2}) {
    EXPECT_EQ(valuesOf(*series, item).back(), static_cast<float>(kDays - 1));
    EXPECT_EQ(series->itemName(item), item == 1 ? "A H" : "B H");
  }
  const std::string faulty = folder.write("f.xml", pi(piSeries("A", events + "<event date=\"2012-13-01\"/>")));
  EXPECT_FALSE(series->open(faulty));
  EXPECT_EQ(series->lastError(),
            faulty + ":20004: expected a valid time like 2001-01-31T12:30:00, found \"2012-13-01\"");
}

TEST(XmlTimeSeries, ReadsDownloadedFiles) {
  const std::tuple<const char*, int, float, float> cases[] = {{"WaterML1Example.xml", 192, 83.0F, 1.0F},
                                                              {"WaterML2Example.xml", 8, 2690.0F, 2.0F}};
  for (const auto& [name, steps, first, code] : cases) {
    MIREVO_REQUIRE_SAMPLE(path, name);
    XmlTimeSeries series;
    ASSERT_TRUE(series.open(path)) << series.lastError();
    EXPECT_EQ(series.timeStepCount(), steps);
    EXPECT_EQ(series.itemUnit(1), "ft3/s");
    EXPECT_EQ(valuesOf(series, 1).front(), first);
    EXPECT_EQ(valuesOf(series, 2).front(), code);
  }
}

}  // namespace
}  // namespace mirevo

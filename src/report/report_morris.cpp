#include "report/report_morris.h"

#include <array>
#include <limits>
#include <string_view>

#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "report/analysis_table.h"

namespace mirevo {
namespace {

/// The columns of the table, by name.
class Columns {
 public:
  explicit Columns(const ReadTable& table) : table_(table) {}

  std::size_t of(std::string_view name) {
    const auto column = table_.column(name);
    if (!column) isComplete_ = false;
    return column.value_or(0);
  }
  std::array<std::size_t, 3> ofLimited(const std::string& name) {
    return {of(name), of(name + "Lower"), of(name + "Upper")};
  }
  bool isComplete() const { return isComplete_; }

 private:
  const ReadTable& table_;
  bool isComplete_ = true;
};

double numberIn(const std::vector<std::string>& row, std::size_t column) {
  return realCell(row[column]).value_or(std::numeric_limits<double>::quiet_NaN());
}

int countIn(const std::vector<std::string>& row, std::size_t column) {
  const double number = numberIn(row, column);
  return number >= 0.0 && number < std::numeric_limits<int>::max() ? static_cast<int>(number) : 0;
}

LimitedValue limitedIn(const std::vector<std::string>& row, const std::array<std::size_t, 3>& columns) {
  return {numberIn(row, columns[0]), numberIn(row, columns[1]), numberIn(row, columns[2])};
}

void writeLimited(JsonWriter& json, std::string_view name, const LimitedValue& value) {
  json.key(name).numbers(std::vector{value.value, value.lower, value.upper}, JsonWriter::Digits::drawn);
}

}  // namespace

std::vector<ReportedScreening> reportedMorris(const std::string& filePrefix, std::string& fault) {
  const std::string path = runFilePath(filePrefix, run_files::kMorris);
  const auto read = readAnalysisTable(path, fault);
  if (!read) return {};
  const ReadTable& table = *read;
  Columns columns(table);
  const std::size_t kind = columns.of("Kind");
  const std::size_t name = columns.of("Name");
  const std::size_t parameter = columns.of("Parameter");
  const auto mu = columns.ofLimited("Mu");
  const auto muStar = columns.ofLimited("MuStar");
  const auto sigma = columns.ofLimited("Sigma");
  const auto share = columns.ofLimited("Share");
  const std::array counts{columns.of("Effects"), columns.of("Rank"), columns.of("RankLower"), columns.of("RankUpper")};
  const std::size_t stability = columns.of("RankStability");
  const std::size_t certainty = columns.of("Certainty");
  const std::size_t verdict = columns.of("Verdict");
  const std::size_t negligible = columns.of("Negligible");
  const std::size_t topCount = columns.of("TopCount");
  const std::size_t topStability = columns.of("TopStability");
  const std::size_t together = columns.of("FixedTogether");
  if (!columns.isComplete() || table.rows.empty()) {
    fault = unshownTable(path);
    return {};
  }
  std::vector<ReportedScreening> screenings;
  for (const std::vector<std::string>& row : table.rows) {
    if (screenings.empty() || screenings.back().kind != row[kind] || screenings.back().name != row[name]) {
      screenings.push_back({row[kind],
                            row[name],
                            numberIn(row, negligible),
                            countIn(row, topCount),
                            numberIn(row, topStability),
                            numberIn(row, together),
                            {}});
    }
    screenings.back().parameters.push_back({row[parameter], limitedIn(row, mu), limitedIn(row, muStar),
                                            limitedIn(row, sigma), limitedIn(row, share), countIn(row, counts[0]),
                                            countIn(row, counts[1]), countIn(row, counts[2]), countIn(row, counts[3]),
                                            numberIn(row, stability), numberIn(row, certainty), row[verdict]});
  }
  return screenings;
}

void writeMorris(JsonWriter& json, const std::vector<ReportedScreening>& screenings) {
  json.key("morris").beginArray();
  for (const ReportedScreening& one : screenings) {
    json.beginObject().member("kind", one.kind).member("name", one.name).member("negligible", one.negligible);
    json.member("topCount", one.topCount).member("topStability", one.topStability);
    json.member("fixedTogether", one.fixedTogether).key("parameters").beginArray();
    for (const ReportedEffects& p : one.parameters) {
      json.beginObject().member("name", p.parameter);
      writeLimited(json, "mu", p.mu);
      writeLimited(json, "muStar", p.muStar);
      writeLimited(json, "sigma", p.sigma);
      writeLimited(json, "share", p.share);
      json.member("effects", p.count).member("rank", p.rank).member("rankLower", p.rankLower);
      json.member("rankUpper", p.rankUpper).member("rankStability", p.rankStability);
      json.member("certainty", p.certainty).optionalMember("verdict", p.verdict).endObject();
    }
    json.endArray().endObject();
  }
  json.endArray();
}

}  // namespace mirevo

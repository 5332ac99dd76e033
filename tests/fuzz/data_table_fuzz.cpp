// What the program writes for programs and for a restart: any text is taken, and what was read is written and read back
// the same.
#include <cstdint>
#include <string_view>

#include "common/data_table.h"
#include "require.h"
#include "run/results/pairs_file.h"
#include "run/results/row_checksums.h"
#include "run/results/run_record.h"

namespace {

std::string tableText(const mirevo::ReadTable& read) {
  mirevo::DataTable table{{}, read.headLines, read.columns, {}};
  for (const auto& cells : read.rows) table.rows.emplace_back(cells.begin(), cells.end());
  return mirevo::dataTableText(table);
}

std::string recordText(std::string_view text) {
  const auto record = mirevo::readRunRecord(text);
  return record ? mirevo::runRecordText(*record, {}) : std::string();
}

std::string checksumText(std::string_view text) {
  std::string rows = "Evaluation\tChecksum\n";
  for (const auto& [number, checksum] : mirevo::readRowChecksums(text)) {
    rows += mirevo::rowChecksumText({number, checksum});
  }
  return rows;
}

std::string pairsText(std::string_view text) {
  return mirevo::pairsTableText({}, mirevo::readPairsTable(text));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const mirevo::ReadTable table = mirevo::readDataTable(text);
  if (table.columns.size() > 1) {
    const mirevo::ReadTable again = mirevo::readDataTable(tableText(table));
    require(again.columns == table.columns && again.rows == table.rows);
  }
  require(recordText(recordText(text)) == recordText(text));
  require(checksumText(checksumText(text)) == checksumText(text));
  require(pairsText(pairsText(pairsText(text))) == pairsText(pairsText(text)));  // 9999-12-31 24:00 has no second time
  return 0;
}

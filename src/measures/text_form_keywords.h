#pragma once

#include <string>
#include <utility>
#include <vector>

#include "common/settings/keyword_row.h"
#include "platform/series/text_form.h"

namespace mirevo {

inline constexpr CodeName kTimeUnitNames[] = {{std::nullopt, kTimeUnitWords[1]},
                                              {std::nullopt, kTimeUnitWords[2]},
                                              {std::nullopt, kTimeUnitWords[3]},
                                              {std::nullopt, kTimeUnitWords[4]}};
inline constexpr CodeName kDecimalSignNames[] = {{std::nullopt, "."}, {std::nullopt, ","}};

/// The keywords of a text table in the section that names its file: they fill the form that `formOf(settings)` returns.
template <class Settings, class FormOf>
std::vector<KeywordRow> textFormRows(FormOf, bool bearsOnResults = true) {
  const auto facts = [bearsOnResults](std::string_view name, std::string meaning) {
    return KeywordFacts{
        .name = name, .defaultValue = kNoDefault, .meaning = std::move(meaning), .bearsOnResults = bearsOnResults};
  };
  const auto count = [&facts](std::string_view name, double most, std::string meaning) {
    KeywordFacts made = facts(name, std::move(meaning));
    made.range = between(0, most);
    made.refusal = "Error: Form of a text file invalid";
    return made;
  };
  KeywordFacts decimalSign = facts("Decimal_Sign", "Of numbers in a text table. Without it, `'.'`.");
  decimalSign.codes = kDecimalSignNames;
  KeywordFacts timeUnit = facts("Time_Unit", "Of times that are numbers, from `Time_Origin` on.");
  timeUnit.codes = kTimeUnitNames;
  KeywordFacts timeStep =
      facts("Time_Step",
            "How many of `Time_Unit` a step is, where the time column has step numbers, or there is "
            "none and rows are counted: step 0 is at `Time_Origin`. Without it, 1.");
  timeStep.range = kPositive;
  timeStep.refusal = "Error: Form of a text file invalid";
  return {setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).skipRows; },
              count("Skip_Rows", 1e9,
                    "Lines at the beginning of a text table, of whatever kind, that are not read. Without it, "
                    "0.")),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).headerRows; },
              count("Header_Rows", 100,
                    "Rows with names of columns, behind these: the names of a column are joined. 0: its name "
                    "is `column` and its number. Without it, 1.")),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).commentSign; },
              facts("Comment_Sign",
                    "Lines that begin with it are comments, wherever they are. Without it, those "
                    "above the header row that begin with `#`.")),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).columnSeparator; },
              facts("Column_Separator",
                    "A character such as `';'`, `'tab'`, or `'blank'` for any number of "
                    "blanks and tabs. Without it, the first tab, semicolon or comma in the "
                    "header row.")),
          choice<Settings>(
              [](Settings& s, const SetupValue& value) { FormOf{}(s).decimalSign = std::get<std::string>(value); },
              std::move(decimalSign)),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).columnWidths; },
              facts("Column_Widths", "Widths of the columns, in characters, of a table without separators.")),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).table; },
              facts("Table",
                    "Which of several tables in the file: its number, where blank lines are between "
                    "them, or how the line above it begins. The table ends with a blank line. Without "
                    "it, the file is one.")),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).timeColumn; },
              facts("Time_Column",
                    "Number or name of the column with the time, or of several, `'year, month, day'`, whose "
                    "texts are joined with a blank; `'none'`: rows are counted. Without it, 1.")),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).timeFormat; },
              facts("Time_Format",
                    "How times are written: YYYY, MM (MMM: Jan) and DD, or YYYY and DDD (day of the year), hh, "
                    "mm, ss and what is between them. Without it, `YYYY-MM-DD hh:mm`.")),
          choice<Settings>(
              [](Settings& s, const SetupValue& value) {
                const auto& name = std::get<std::string>(value);
                for (std::size_t i = 0; i < std::size(kTimeUnitWords); ++i) {
                  if (kTimeUnitWords[i] == name) FormOf{}(s).timeUnit = static_cast<TimeUnit>(i);
                }
              },
              std::move(timeUnit)),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).timeOrigin; },
              facts("Time_Origin", "The date from which times in `Time_Unit` are counted.")),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).timeStep; }, std::move(timeStep)),
          setting<Settings>(
              [](auto& s) -> auto& { return FormOf{}(s).missingValues; },
              facts("Missing_Value",
                    "Numbers that mark missing values of a text table, besides that of `# missing =` in it."))};
}

}  // namespace mirevo

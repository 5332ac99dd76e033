#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

class InstructionFile;
class ReadingWatch;

/// An output-measure file behind the first one; file names are absolute.
struct MeasureFileSource {
  std::string fileName;
  std::string instructionFile;
  std::shared_ptr<const InstructionFile> instructions = {};  ///< its content: where the numbers are
};

/// What a model wrote to an output-measure file.
struct MeasureFile {
  std::vector<double> numbers;
  bool endsLine = true;  ///< the last line has an end
};

/// The numbers of an output-measure file in free format: separated by blanks, tabs, commas, semicolons or line ends,
/// `#` comments to the end of the line. Empty, with line and cause in `reason`, when it cannot be read, when something
/// in it is not a number, and when it could as well be meant with decimal commas: if each of its words is a number then
/// (`0,153`), and they are at least `neededCount`, the number of the last that is used; and when the time of `watch` is
/// over. With `instructions`, the numbers that these read, in their order, and what they may not mean in `doubts`.
std::optional<MeasureFile> readMeasureFile(const std::string& fileName, std::size_t neededCount, std::string& reason,
                                           ReadingWatch& watch, const InstructionFile* instructions = nullptr,
                                           std::vector<std::string>* doubts = nullptr);
/// The same for content in memory; `sourceName` is used in `reason`, `watch` may be null.
std::optional<MeasureFile> parseMeasureFile(const std::string& sourceName, std::string_view content,
                                            std::size_t neededCount, std::string& reason,
                                            ReadingWatch* watch = nullptr);

}  // namespace mirevo

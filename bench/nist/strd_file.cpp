#include "strd_file.h"

#include <algorithm>
#include <cctype>
#include <cmath>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace mirevo::bench {
namespace {

/// The numbers at the beginning of a text.
std::vector<double> numbersOf(const std::string& text) {
  std::istringstream stream(text);
  std::vector<double> numbers;
  for (double number = 0.0; stream >> number;) numbers.push_back(number);
  return numbers;
}

}  // namespace

StrdSet readStrdSet(const std::string& folder, const std::string& name) {
  std::ifstream file(folder + "/" + name + ".dat");
  StrdSet set;
  set.name = name;
  bool isData = false;
  for (std::string line; std::getline(file, line);) {
    if (isData) {
      std::vector<double> numbers = numbersOf(line);
      if (numbers.size() < 2) continue;
      set.y.push_back(name == "Nelson" ? std::log(numbers[0]) : numbers[0]);
      set.x.emplace_back(numbers.begin() + 1, numbers.end());
      continue;
    }
    const std::size_t equals = line.find('=');
    const std::size_t first = line.find_first_not_of(' ');
    if (line.starts_with("Residual Sum of Squares:")) {
      set.sumOfSquares = std::stod(line.substr(line.find(':') + 1));
    } else if (line.starts_with("Data:") && line.find("Response") == std::string::npos) {
      isData = true;
    } else if (equals != std::string::npos && line[first] == 'b') {
      const std::vector<double> numbers = numbersOf(line.substr(equals + 1));
      if (numbers.size() != 4) continue;
      set.starts[0].push_back(numbers[0]);
      set.starts[1].push_back(numbers[1]);
      set.certified.push_back(numbers[2]);
      set.deviations.push_back(numbers[3]);
    }
  }
  // The file prints 1.20196866396E-0; the residual sum of squares that it certifies is that of 0.20196866396.
  if (name == "Roszman1") set.certified.at(0) -= 1.0;
  if (set.y.empty() || set.certified.empty()) throw std::runtime_error(folder + "/" + name + ".dat cannot be read");
  return set;
}

}  // namespace mirevo::bench

#include "common/number_border.h"

namespace mirevo {
namespace {

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}
bool isSign(char c) {
  return c == '+' || c == '-';
}
bool isExponent(char c) {
  return c == 'e' || c == 'E' || c == 'd' || c == 'D';
}

}  // namespace

bool isInsideNumber(std::string_view line, std::size_t at, char point) {
  if (at == 0 || at >= line.size()) return false;
  const char left = line[at - 1];
  const char right = line[at];
  const auto isAt = [line](std::size_t place, auto is) { return place < line.size() && is(line[place]); };
  const auto isDigitOrPoint = [point](char c) { return isDigit(c) || c == point; };
  if (isDigitOrPoint(left) && isDigitOrPoint(right)) return true;
  if (isDigitOrPoint(left) && isExponent(right)) {
    return isAt(at + 1, isDigit) || (isAt(at + 1, isSign) && isAt(at + 2, isDigit));
  }
  if (isExponent(left) && at > 1 && isDigitOrPoint(line[at - 2])) {
    return isDigit(right) || (isSign(right) && isAt(at + 1, isDigit));
  }
  return isSign(left) && isDigit(right) && at > 2 && isExponent(line[at - 2]) && isDigitOrPoint(line[at - 3]);
}

bool isInsideSigned(std::string_view line, std::size_t at, char point) {
  if (isInsideNumber(line, at, point)) return true;
  return at > 0 && at < line.size() && isSign(line[at - 1]) && (isDigit(line[at]) || line[at] == point);
}

}  // namespace mirevo

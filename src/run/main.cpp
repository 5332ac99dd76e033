#include <cstdio>

int main() {
  std::fputs("Usage: Mirevo kdx-file\n", stderr);
  return 1;
}

#include <string>
#include <vector>

#include "import/import_program.h"

int main(int argc, char** argv) {
  const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
  return mirevo::importProgram(arguments);
}

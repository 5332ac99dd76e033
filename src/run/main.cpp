#include "run/mirevo_main.h"

int main(int argc, char** argv) {
  mirevo::processStart(argc, argv);
}

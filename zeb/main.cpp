#include <unistd.h>

#include <cstdlib>
#include <iostream>
#include <string>
#include <vector>

#include "zeb/Commands.h"

int main(int argc, char** argv) {
  zeb::Console console(std::cout, std::cerr);
  console.setOutIsTerminal(isatty(STDOUT_FILENO) == 1);
  console.setErrIsTerminal(isatty(STDERR_FILENO) == 1);
  // No thread has been started yet.
  const char* noColor = std::getenv("NO_COLOR");  // NOLINT(concurrency-mt-unsafe)
  console.setColorsUnwanted(noColor != nullptr && *noColor != '\0');

  const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
  return static_cast<int>(zeb::run(arguments, console));
}

// The program bvmake: all of it is in the library, where tests and other programs reach it.
#include <cstdio>
#include <exception>
#include <string>
#include <vector>

#include "bvmake/CommandLine.h"

int main(int argc, char** argv) {
  try {
    return bvmake::runProgram(std::vector<std::string>(argv + (argc > 0 ? 1 : 0), argv + argc),
                              stdout, stderr);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "bvmake: error: %s\n", exception.what());
    return static_cast<int>(bvmake::ExitCode::failure);
  }
}

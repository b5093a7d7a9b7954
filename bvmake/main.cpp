// The program bvmake: all of it is in the library, where tests and other programs reach it.
#include <malloc.h>

#include <cstdio>
#include <exception>
#include <string>
#include <vector>

#include "bvmake/CommandLine.h"

int main(int argc, char** argv) {
  // Large pieces of memory go back to the system as soon as they are free. Left to itself, malloc
  // raises the first of the two with the largest piece that was ever given back, and keeps what is
  // smaller: an eighth more memory for no time at all.
  mallopt(M_MMAP_THRESHOLD, 1 << 20);
  mallopt(M_TRIM_THRESHOLD, 16 << 20);
  try {
    return bvmake::runProgram(std::vector<std::string>(argv + (argc > 0 ? 1 : 0), argv + argc),
                              stdout, stderr);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "bvmake: error: %s\n", exception.what());
    return static_cast<int>(bvmake::ExitCode::failure);
  }
}

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
  // smaller: up to a third more memory. Lower numbers save little more and cost time.
  mallopt(M_MMAP_THRESHOLD, 4 << 20);   // NOLINT(concurrency-mt-unsafe): no other thread yet
  mallopt(M_TRIM_THRESHOLD, 64 << 20);  // NOLINT(concurrency-mt-unsafe)
  try {
    return bvmake::runProgram(std::vector<std::string>(argv + (argc > 0 ? 1 : 0), argv + argc),
                              stdout, stderr);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "bvmake: error: %s\n", exception.what());
    return static_cast<int>(bvmake::ExitCode::failure);
  }
}

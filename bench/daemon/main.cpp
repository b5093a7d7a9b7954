// What the daemon does under load, and what becomes of its memory: tables for docs/benchmarks.md.
#include <cstdlib>
#include <iostream>
#include <string>

#include "bench/daemon/EightHours.h"
#include "bench/daemon/Load.h"

int main(int argc, char** argv) {
  const std::string what = argc > 1 ? argv[1] : "";
  if (what == "load") {
    const int clients = argc > 2 ? std::atoi(argv[2]) : 64;
    const double seconds = argc > 3 ? std::atof(argv[3]) : 60;
    return measureLoad(clients, seconds) ? 0 : 1;
  }
  if (what == "hours") {
    return measureHours(argc > 2 ? std::atoi(argv[2]) : 8) ? 0 : 1;
  }
  std::cerr << "bench_daemon: load [CLIENTS] [SECONDS], or hours [HOURS]\n";
  return 2;
}

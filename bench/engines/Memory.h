// How much memory a search takes, in a process of its own.
#pragma once

#include <cstddef>
#include <string>

namespace engines {

struct MemoryUse {
  /// Bytes beyond those before the books were opened, at the most; pages of the mapped files that
  /// were touched are among them.
  size_t resident = 0;
  /// Those of them that belong to no file.
  size_t anonymous = 0;
};

/// Runs this program again to open the books of a folder and search them for each word of
/// `questions`, as it is and as a beginning.
/// Throws std::runtime_error.
MemoryUse memoryOfSearch(const std::string& engine, const std::string& folder,
                         const std::string& questions);

/// What that other process does; prints the two numbers. Returns its exit code.
int searchForMemory(const std::string& engine, const std::string& folder,
                    const std::string& questions);

}  // namespace engines

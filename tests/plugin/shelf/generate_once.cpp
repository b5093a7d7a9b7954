// Generates the index of one book as the plug-in does and exits: a second process for tests.
//   generate_once TOOL CACHES BOOKID FOLDER
// Exits with 0 when the index was made, 3 when it was not.
#include <cstdio>

#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Processes.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

int main(int argc, char** argv) {
  if (argc != 5) {
    return 2;
  }
  platform::Environment environment = platform::Environment::system();
  environment.processLauncher = platform::substitutingProcessLauncher("/usr/bin/bvmake", argv[1]);
  environment.cachesDirectory = argv[2];
  environment.standardOutput = [](const std::string&) {};
  const platform::EnvironmentOverride inForce(std::move(environment));
  const auto shelf = ZEBIndexshelf::initWithOwner(nullptr);
  const auto book = ZEBHelpBook::bookWithID(argv[3], 1, argv[4]);
  ZEBIndexGenerationOperation::initWithBook(book, nullptr, shelf, false)->start();
  return shelf->_knownIndices().contains(argv[3]) ? 0 : 3;
}

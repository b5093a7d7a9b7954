// Any bytes as a help-index file, as a keyword index and as semantic data: what checks them must
// come to an end and tell what is wrong in lines.
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "SearchKit/IndexCheck.h"
#include "SearchKit/SearchKit.h"
#include "bvmake/Check.h"
#include "host/Luxwell/LUXIndexCheck.h"
#include "platform/ClassicArchive.h"
#include "platform/Exception.h"

namespace {

void check(const std::vector<std::string>& problems, size_t most) {
  if (problems.size() > most) {
    std::abort();
  }
  for (const std::string& problem : problems) {
    if (problem.empty()) {
      std::abort();
    }
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const auto bytes = platform::Data::adopt(std::vector<uint8_t>(data, data + size));
  if (const SKIndexRef index = SKIndexOpenWithData(bytes)) {
    check(searchkit::indexProblems(*index, 10), 10);
  }
  check(LUXIndexProblems(bytes, 10), 10);
  try {
    const platform::Value root = platform::ClassicUnarchiver(bytes).decodeRootObject();
    if (root.dictionaryIf() != nullptr) {
      check(bvmake::helpIndexProblems(root), 5 * (bvmake::maximumProblemCount + 1));
    }
  } catch (const platform::Exception&) {
    // No archive.
  }
  return 0;
}

// Ends with status 0 when it is the code of the bundle whose identifier it is given.
#include <string>

#include "platform/Bundle.h"

namespace {

int codeOfThisProgram() { return 0; }

}  // namespace

int main(int count, char** arguments) {
  const auto bundle =
      platform::Bundle::bundleWithCode(reinterpret_cast<const void*>(&codeOfThisProgram));
  const bool same =
      count == 2 && bundle != nullptr && bundle->bundleIdentifier() == std::string(arguments[1]);
  return same ? codeOfThisProgram() : 1;
}

#include <string_view>

#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginEntry.h"
#include "plugin/front/HelpPluginController.h"

extern "C" bool ZEBPluginMakeInstance(const char* principalClass,
                                      const std::shared_ptr<ZEBPluginOwner>* owner,
                                      std::shared_ptr<ZEBPlugin>* instance);

namespace {

// The linker exports the function by its name; this holds it to the type that hosts call it by.
[[maybe_unused]] constexpr ZEBPluginEntry* entry = &ZEBPluginMakeInstance;

}  // namespace

bool ZEBPluginMakeInstance(const char* principalClass, const std::shared_ptr<ZEBPluginOwner>* owner,
                           std::shared_ptr<ZEBPlugin>* instance) {
  if (principalClass == nullptr || owner == nullptr || instance == nullptr ||
      std::string_view(principalClass) != "HelpPluginController") {
    ZEBLog(1, "No class \"%@\" in this bundle", principalClass);
    return false;
  }
  try {
    *instance = HelpPluginController::initWithOwner(*owner);
    return true;
  } catch (const std::exception& exception) {
    ZEBLog(0, "%@", exception);
    return false;
  }
}

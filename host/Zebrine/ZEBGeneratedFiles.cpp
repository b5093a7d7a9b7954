#include "host/Zebrine/ZEBGeneratedFiles.h"

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Environment.h"
#include "platform/Files.h"

std::optional<std::string> ZEBGeneratedRoot() {
  const std::optional<std::string> caches = platform::Environment::current()->cachesDirectory;
  return caches
             ? std::optional(*caches + "/" + ZEBDaemonBundleID + "/" + ZEBGeneratedIndexDirectory)
             : std::nullopt;
}

std::string ZEBGeneratedFilePath(const std::string& root, const std::string& bookID,
                                 const std::string& localization, std::string_view extension) {
  const std::string file = bookID + "/" + (localization.empty() ? bookID : localization);
  return platform::stringByAppendingPathComponent(
      root, platform::stringByAppendingPathExtension(file, extension));
}

#include "host/Zebrine/ZEBCacheManager.h"

std::optional<platform::URL> ZEBCacheManager::remoteURLForLocalURL(
    const platform::URL& /*localURL*/, const std::shared_ptr<ZEBHelpBook>& /*inBook*/) {
  return std::nullopt;
}

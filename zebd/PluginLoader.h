// Loads plug-ins from their bundles.
#pragma once

#include <memory>
#include <string>

#include "platform/Error.h"

class ZEBPlugin;
class ZEBPluginOwner;

namespace zebd {

/// Loads the code of the bundle at `bundlePath`, an absolute path, and has an instance of its
/// principal class made for `owner`. Null, with `error` set, when the path is not absolute, the
/// bundle has no information list, principal class or code, the code cannot be loaded or has no
/// entry, or the class refuses. To be called on the main thread. The code stays loaded for good:
/// its background work cannot be known to have ended.
std::shared_ptr<ZEBPlugin> loadPlugin(const std::string& bundlePath,
                                      const std::shared_ptr<ZEBPluginOwner>& owner,
                                      platform::Error& error);

}  // namespace zebd

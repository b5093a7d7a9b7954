// How a host gets at the plug-in in a bundle whose code it has loaded.
#pragma once

#include <memory>

class ZEBPlugin;
class ZEBPluginOwner;

/// Name of the one C function that the code of a plug-in bundle exports.
inline constexpr const char* ZEBPluginEntryName = "ZEBPluginMakeInstance";

/// Its type. Makes an instance of the class `principalClass`, which is what the bundle's
/// information list names under platform::Bundle::principalClassKey, for `owner`, and puts it into
/// `instance`. Returns false, with `instance` as it was, when the bundle has no such class or the
/// class refuses; that is logged. Throws nothing. To be called on the thread that runs the main
/// loop. The code must never be unloaded: background work may still be running in it.
using ZEBPluginEntry = bool(const char* principalClass,
                            const std::shared_ptr<ZEBPluginOwner>* owner,
                            std::shared_ptr<ZEBPlugin>* instance);

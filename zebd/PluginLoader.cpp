#include "zebd/PluginLoader.h"

#include <dlfcn.h>

#include <optional>

#include "host/Zebrine/ZEBPlugin.h"
#include "host/Zebrine/ZEBPluginEntry.h"
#include "platform/Bundle.h"

namespace zebd {

namespace {

platform::Error unusable(const std::string& bundlePath, const std::string& reason) {
  const std::string name = bundlePath.empty() ? std::string() : " " + bundlePath;
  return platform::formatError("the plug-in" + name + " cannot be used: " + reason);
}

std::string loaderMessage() {
  const char* message = ::dlerror();  // NOLINT(concurrency-mt-unsafe): glibc keeps one per thread
  return message == nullptr ? "no reason given" : message;
}

}  // namespace

std::shared_ptr<ZEBPlugin> loadPlugin(const std::string& bundlePath,
                                      const std::shared_ptr<ZEBPluginOwner>& owner,
                                      platform::Error& error) {
  // A relative path would be looked up by the loader's search path, or wherever the user happens
  // to be.
  if (!bundlePath.starts_with('/')) {
    error = unusable(bundlePath, "its path is not absolute");
    return nullptr;
  }
  const auto bundle = platform::Bundle::bundleWithPath(bundlePath);
  if (bundle == nullptr) {
    error = unusable(bundlePath, "there is no readable information list");
    return nullptr;
  }
  const std::optional<std::string> executable = bundle->executablePath();
  if (!executable) {
    error = unusable(bundlePath, "its information list names no code");
    return nullptr;
  }
  void* code = ::dlopen(executable->c_str(), RTLD_NOW | RTLD_LOCAL);
  if (code == nullptr) {
    error = unusable(bundlePath, loaderMessage());
    return nullptr;
  }
  auto* const entry = reinterpret_cast<ZEBPluginEntry*>(::dlsym(code, ZEBPluginEntryName));
  if (entry == nullptr) {
    error = unusable(bundlePath, loaderMessage());
    return nullptr;
  }
  std::shared_ptr<ZEBPlugin> plugin;
  const std::string principalClass = bundle->principalClass();
  if (!entry(principalClass.c_str(), &owner, &plugin) || plugin == nullptr) {
    error = unusable(bundlePath, "it has no class \"" + principalClass + "\"");
    return nullptr;
  }
  return plugin;
}

}  // namespace zebd

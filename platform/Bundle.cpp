#include "platform/Bundle.h"

#include <dlfcn.h>

#include <utility>

#include "platform/Files.h"
#include "platform/PropertyList.h"

namespace platform {

Bundle::Bundle(std::string path, Value information)
    : _path(std::move(path)), _information(std::move(information)) {}

std::shared_ptr<const Bundle> Bundle::bundleWithPath(const std::string& path) {
  const std::optional<Value> information =
      dictionaryWithContentsOfFile(stringByAppendingPathComponent(path, "Info.plist"));
  return information ? std::shared_ptr<const Bundle>(new Bundle(path, *information)) : nullptr;
}

std::shared_ptr<const Bundle> Bundle::bundleWithCode(const void* address) {
  Dl_info information{};
  if (::dladdr(address, &information) == 0 || information.dli_fname == nullptr) {
    return nullptr;
  }
  return bundleWithPath(stringByDeletingLastPathComponent(information.dli_fname));
}

std::string Bundle::bundleIdentifier() const {
  return _information[identifierKey].stringValue().value_or(std::string());
}

std::optional<std::string> Bundle::executablePath() const {
  const std::string* name = _information[executableKey].stringIf();
  if (name == nullptr || name->empty() || name->find('/') != std::string::npos || *name == "..") {
    return std::nullopt;
  }
  return stringByAppendingPathComponent(_path, *name);
}

std::string Bundle::principalClass() const {
  return _information[principalClassKey].stringValue().value_or(std::string());
}

}  // namespace platform

#include "platform/Bundle.h"

#include <dlfcn.h>
#include <link.h>

#include <filesystem>
#include <system_error>
#include <utility>

#include "platform/Files.h"
#include "platform/PropertyList.h"

namespace platform {

Bundle::Bundle(std::string path, Value information)
    : _path(std::move(path)), _information(std::move(information)) {}

std::shared_ptr<const Bundle> Bundle::bundleWithPath(const std::string& path) {
  const std::optional<Value> information =
      dictionaryWithContentsOfFile(stringByAppendingPathComponent(path, "Info.plist"));
  if (!information) {
    return nullptr;
  }
  return std::shared_ptr<const Bundle>(new Bundle(path, *information));
}

namespace {

/// The absolute path of a loaded object; empty where that cannot be told.
std::string pathOfObject(const link_map& object) {
  // The linker knows the program itself by no name, and dladdr would give the one that the caller
  // typed, which may be no path at all.
  std::error_code error;
  if (*object.l_name == '\0') {
    return std::filesystem::read_symlink("/proc/self/exe", error).native();
  }
  return std::filesystem::absolute(object.l_name, error).native();
}

}  // namespace

std::shared_ptr<const Bundle> Bundle::bundleWithCode(const void* address) {
  Dl_info information{};
  link_map* object = nullptr;
  const int found =
      ::dladdr1(address, &information, reinterpret_cast<void**>(&object), RTLD_DL_LINKMAP);
  if (found == 0 || object == nullptr) {
    return nullptr;
  }
  const std::string path = pathOfObject(*object);
  if (path.empty()) {
    return nullptr;
  }
  return bundleWithPath(stringByDeletingLastPathComponent(path));
}

std::string Bundle::bundleIdentifier() const {
  return _information[identifierKey].stringValue().value_or(std::string());
}

std::optional<std::string> Bundle::executablePath() const {
  const std::string* name = _information[executableKey].stringIf();
  if (name == nullptr || name->empty() || *name == "." || *name == ".." ||
      name->find('/') != std::string::npos || name->find('\0') != std::string::npos) {
    return std::nullopt;
  }
  return stringByAppendingPathComponent(_path, *name);
}

std::string Bundle::principalClass() const {
  return _information[principalClassKey].stringValue().value_or(std::string());
}

}  // namespace platform

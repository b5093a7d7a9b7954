#include "platform/Bundle.h"

#include <dlfcn.h>
#include <link.h>

#include <filesystem>
#include <system_error>
#include <utility>

#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/PropertyList.h"

namespace platform {

namespace {

constexpr const char* resourcesFolder = "Resources";

}  // namespace

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

std::optional<std::string> Bundle::pathForResource(
    const std::string& name, const std::optional<std::string>& ofType,
    const std::optional<std::string>& inDirectory,
    const std::optional<std::string>& forLocalization) const {
  const std::string file = ofType && !ofType->empty() ? name + "." + *ofType : name;
  const std::string within = inDirectory && !inDirectory->empty()
                                 ? stringByAppendingPathComponent(*inDirectory, file)
                                 : file;
  if (file.empty() || within.find('\0') != std::string::npos) {
    return std::nullopt;
  }
  const std::string resources = stringByAppendingPathComponent(_path, resourcesFolder);
  const auto existing = [&](const std::string& folder) -> std::optional<std::string> {
    const std::string path =
        stringByStandardizingPath(stringByAppendingPathComponent(folder, within));
    const bool isInside = path.starts_with(stringByStandardizingPath(resources) + "/");
    return isInside && Environment::current()->files->fileExistsAtPath(path) ? std::optional(path)
                                                                             : std::nullopt;
  };
  if (forLocalization && !forLocalization->empty()) {
    if (auto path =
            existing(stringByAppendingPathComponent(resources, *forLocalization + ".lproj"))) {
      return path;
    }
  }
  return existing(resources);
}

std::string Bundle::principalClass() const {
  return _information[principalClassKey].stringValue().value_or(std::string());
}

}  // namespace platform

// Folders that hold code or resources together with an information property list.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/Value.h"

namespace platform {

/// A bundle: a folder with a property list "Info.plist" that says what the folder is.
/// Thread-safety: immutable.
class Bundle {
 public:
  /// Identifier, in reverse-DNS form.
  static constexpr const char* identifierKey = "BundleIdentifier";
  static constexpr const char* versionKey = "BundleVersion";
  /// File name of the code, beside the list.
  static constexpr const char* executableKey = "BundleExecutable";
  static constexpr const char* principalClassKey = "BundlePrincipalClass";

  /// Null when the folder has no readable information list.
  static std::shared_ptr<const Bundle> bundleWithPath(const std::string& path);

  /// The bundle of the code at `address`: the folder of the shared object that it was loaded from,
  /// or of the program itself. Null where that folder is no bundle, and for an address of no code.
  static std::shared_ptr<const Bundle> bundleWithCode(const void* address);

  const std::string& bundlePath() const { return _path; }
  /// Empty when the list has none.
  std::string bundleIdentifier() const;
  /// Path of the code; absent when the list names none, or names one outside the folder.
  std::optional<std::string> executablePath() const;
  std::string principalClass() const;

  /// The file or folder of that name, with `.ofType` behind it where one is given, in the bundle's
  /// resource folder ("Resources"): in the language folder of `forLocalization` where one is given
  /// and has it, else outside all language folders. Absent when there is none, and for names that
  /// lead elsewhere.
  std::optional<std::string> pathForResource(
      const std::string& name, const std::optional<std::string>& ofType,
      const std::optional<std::string>& inDirectory,
      const std::optional<std::string>& forLocalization) const;
  const Value& infoDictionary() const { return _information; }

 private:
  Bundle(std::string path, Value information);

  const std::string _path;
  const Value _information;
};

}  // namespace platform

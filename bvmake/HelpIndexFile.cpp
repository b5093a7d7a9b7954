#include "bvmake/HelpIndexFile.h"

#include <utility>

#include "platform/ClassicArchive.h"
#include "platform/Environment.h"
#include "platform/Exception.h"

namespace bvmake {

platform::Data helpIndexFile(const platform::Data& indexData, const platform::Value& anchors) {
  platform::Value::Dictionary root;
  root.emplace(helpindexkeys::indexData, indexData);
  root.emplace(helpindexkeys::useRemoteRoot, false);
  if (!anchors.isAbsent()) {
    root.emplace(helpindexkeys::anchorData, anchors);
  }
  return platform::classicArchiveWithRootObject(std::move(root));
}

std::optional<platform::Value> readHelpIndexFile(const std::string& path, platform::Error* error) {
  const auto files = platform::Environment::current()->files;
  const std::optional<platform::Data> bytes = files->contentsMappedAtPath(path, error);
  if (!bytes) {
    return std::nullopt;
  }
  try {
    platform::Value root = platform::ClassicUnarchiver(*bytes).decodeRootObject();
    if (root.dictionaryIf() != nullptr) {
      return root;
    }
    if (error != nullptr) {
      *error = platform::formatError("an archive, but not of a dictionary");
    }
  } catch (const platform::Exception& exception) {
    if (error != nullptr) {
      *error = platform::formatError(exception.reason());
    }
  }
  return std::nullopt;
}

}  // namespace bvmake

#include "bvmake/HelpIndexFile.h"

#include <utility>

#include "platform/ClassicArchive.h"
#include "platform/Environment.h"
#include "platform/Exception.h"

namespace bvmake {

namespace {

using platform::ClassicArchive;

void setError(platform::Error* error, std::string description) {
  if (error != nullptr) {
    *error = platform::formatError(std::move(description));
  }
}

bool isDictionary(const ClassicArchive::Node& node) {
  return node.nodeClass == ClassicArchive::Class::dictionary ||
         node.nodeClass == ClassicArchive::Class::mutableDictionary;
}

ClassicArchive::NodeIndex addNode(ClassicArchive& archive, ClassicArchive::Class nodeClass,
                                  platform::Data bytes) {
  ClassicArchive::Node node;
  node.nodeClass = nodeClass;
  node.bytes = std::move(bytes);
  archive.nodes.push_back(std::move(node));
  return static_cast<ClassicArchive::NodeIndex>(archive.nodes.size() - 1);
}

}  // namespace

platform::Data helpIndexFile(const platform::Data& indexData, const platform::Data& luxIndexData,
                             platform::Value anchors) {
  platform::Value::Dictionary root;
  root.emplace(helpindexkeys::luxIndexData, luxIndexData);
  root.emplace(helpindexkeys::indexData, indexData);
  root.emplace(helpindexkeys::useRemoteRoot, false);
  if (!anchors.isAbsent()) {
    root.emplace(helpindexkeys::anchorData, std::move(anchors));
  }
  // In two steps, so that the values are gone when the bytes are made.
  const ClassicArchive archive = platform::classicarchive::graph(std::move(root));
  return platform::classicarchive::encode(archive);
}

std::optional<platform::Data> helpIndexFileWithLUXIndexData(const platform::Data& file,
                                                            const platform::Data& luxIndexData,
                                                            platform::Error* error) {
  try {
    ClassicArchive archive = platform::classicarchive::decode(file);
    const ClassicArchive::NodeIndex root =
        archive.roots.empty() ? ClassicArchive::nil : archive.roots.front();
    if (root == ClassicArchive::nil || !isDictionary(archive.nodes[root])) {
      setError(error, "an archive, but not of a dictionary");
      return std::nullopt;
    }
    const ClassicArchive::NodeIndex data =
        addNode(archive, ClassicArchive::Class::data, luxIndexData);
    // Of two equal keys the later one counts.
    size_t place = archive.nodes[root].children.size();
    for (size_t at = 0; at < archive.nodes[root].children.size(); at += 2) {
      const ClassicArchive::NodeIndex key = archive.nodes[root].children[at];
      if (key != ClassicArchive::nil &&
          archive.nodes[key].nodeClass == ClassicArchive::Class::string &&
          archive.nodes[key].bytes.view() == helpindexkeys::luxIndexData) {
        place = at;
      }
    }
    if (place == archive.nodes[root].children.size()) {
      const ClassicArchive::NodeIndex key =
          addNode(archive, ClassicArchive::Class::string,
                  platform::Data::copy(helpindexkeys::luxIndexData));
      archive.nodes[root].children.push_back(key);
      archive.nodes[root].children.push_back(data);
    } else {
      archive.nodes[root].children[place + 1] = data;
    }
    return platform::classicarchive::encode(archive);
  } catch (const platform::Exception& exception) {
    setError(error, exception.reason());
    return std::nullopt;
  }
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
    setError(error, "an archive, but not of a dictionary");
  } catch (const platform::Exception& exception) {
    setError(error, exception.reason());
  }
  return std::nullopt;
}

}  // namespace bvmake

#include "host/Luxwell/HelpLUXModel.h"

#include <fmt/format.h>
#include <utility>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelFile.h"
#include "host/Luxwell/LUXModelGroups.h"
#include "host/Luxwell/LUXModelTrainer.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXParallel.h"
#include "platform/Environment.h"
#include "platform/Exception.h"

namespace {

// Below the user's caches folder, beside what else the daemon keeps there.
constexpr const char* modelsFolder = "org.zeb.zebd/Models";

constexpr size_t longestComponent = 200;

struct GroupList {
  platform::Mutex mutex;
  std::shared_ptr<const LUXModelGroups> groups GUARDED_BY(mutex) =
      std::make_shared<const LUXModelGroups>();
};

GroupList& groupList() {
  // Never destroyed: background work may still ask while the process ends.
  static GroupList& list = *new GroupList;
  return list;
}

std::shared_ptr<const LUXModelGroups> currentGroups() {
  const platform::MutexLock lock(groupList().mutex);
  return groupList().groups;
}

bool isPlain(char byte) {
  return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') ||
         (byte >= '0' && byte <= '9') || byte == '-' || byte == '_' || byte == ' ' || byte == '.';
}

// A name as one component of a path, another for another name. Whatever could be read as something
// else is escaped, and what is too long for a file name is cut and told apart by a checksum.
std::string pathComponent(std::string_view name) {
  std::string component;
  for (const char byte : name) {
    if (isPlain(byte) && !(byte == '.' && component.empty())) {
      component += byte;
    } else {
      component += fmt::format("%{:02X}", static_cast<uint8_t>(byte));
    }
  }
  if (component.empty()) {
    return "%";
  }
  if (component.size() > longestComponent) {
    uint64_t hash = 0xCBF29CE484222325ULL;
    for (const char byte : name) {
      hash = (hash ^ static_cast<uint8_t>(byte)) * 0x100000001B3ULL;
    }
    component.resize(longestComponent);
    component += fmt::format("%%{:016X}", hash);
  }
  return component;
}

}  // namespace

void HelpLUXModel::setGroupList(const platform::Value& list) {
  auto groups = std::make_shared<const LUXModelGroups>(list);
  const platform::MutexLock lock(groupList().mutex);
  groupList().groups = std::move(groups);
}

bool HelpLUXModel::setGroupListFromFile(const std::string& path) {
  const auto data = platform::Environment::current()->files->contentsAtPath(path);
  auto list = data ? LUXModelGroups::listFromData(*data) : std::nullopt;
  if (list) {
    setGroupList(*list);
  }
  return list.has_value();
}

std::string HelpLUXModel::modelGroupNameForHelpbookID(std::string_view helpbookID) {
  return currentGroups()->groupOfBook(helpbookID);
}

float HelpLUXModel::combiningWeightForModelGroupName(std::string_view modelGroupName) {
  return currentGroups()->weightOfGroup(modelGroupName);
}

float HelpLUXModel::combiningWeightForHelpbookID(std::string_view helpbookID) {
  return currentGroups()->weightOfBook(helpbookID);
}

platform::Value HelpLUXModel::helpbookPropertiesForHelpbookID(std::string_view helpbookID,
                                                              std::string_view modelGroupName) {
  return currentGroups()->propertiesOfBook(helpbookID, modelGroupName);
}

std::vector<std::string> HelpLUXModel::allModelGroupNames() { return currentGroups()->names(); }

std::set<std::string> HelpLUXModel::copyHelpbookIDsForModelGroupName(
    std::string_view modelGroupName, bool includeSmoothingBooks) {
  return currentGroups()->booksOfGroup(modelGroupName, includeSmoothingBooks);
}

std::string HelpLUXModel::directoryPathForModelGroupName(std::string_view modelGroupName,
                                                         std::string_view language) {
  const std::optional<std::string> caches = platform::Environment::current()->cachesDirectory;
  return caches ? fmt::format("{}/{}/{}/{}", *caches, modelsFolder, pathComponent(modelGroupName),
                              pathComponent(language))
                : std::string();
}

bool HelpLUXModel::modelExistsForGroupName(std::string_view modelGroupName,
                                           std::string_view language) {
  const std::string folder = directoryPathForModelGroupName(modelGroupName, language);
  bool isDirectory = false;
  return !folder.empty() &&
         platform::Environment::current()->files->fileExistsAtPath(LUXModelFile(folder).path(),
                                                                   &isDirectory) &&
         !isDirectory;
}

bool HelpLUXModel::modelExistsForHelpbookID(std::string_view helpbookID,
                                            std::string_view language) {
  return modelExistsForGroupName(modelGroupNameForHelpbookID(helpbookID), language);
}

std::shared_ptr<HelpLUXModel> HelpLUXModel::initWithDirectoryPath(std::string path,
                                                                  std::string language) {
  bool isDirectory = false;
  if (path.empty() || path.find('\0') != std::string::npos ||
      (platform::Environment::current()->files->fileExistsAtPath(path, &isDirectory) &&
       !isDirectory)) {
    return nullptr;
  }
  return std::shared_ptr<HelpLUXModel>(new HelpLUXModel(std::move(path), std::move(language)));
}

HelpLUXModel::HelpLUXModel(std::string path, std::string language)
    : _language(std::move(language)), _file(std::make_unique<LUXModelFile>(std::move(path))) {}

HelpLUXModel::~HelpLUXModel() = default;

const std::string& HelpLUXModel::modelDirectoryPath() const noexcept {
  return _file->directoryPath();
}

bool HelpLUXModel::needsBuild() const {
  const auto saved = view();
  return saved == nullptr || saved->tokenizerVersion() != HelpTokenizer::version() ||
         saved->language() != _language;
}

std::shared_ptr<const LUXModelView> HelpLUXModel::view() const { return _file->view(); }

void HelpLUXModel::loadLSMMap() {
  const auto saved = view();
  if (saved != nullptr && !saved->checksumsMatch()) {
    _file->distrust(saved);
  }
}

std::vector<std::string> HelpLUXModel::allHelpbookIDs() const {
  {
    const platform::MutexLock lock(_mutex);
    if (_trainer != nullptr) {
      return _trainer->books();
    }
  }
  std::vector<std::string> books;
  if (const auto saved = view()) {
    for (uint32_t book = 0; book < saved->bookCount(); ++book) {
      books.emplace_back(saved->bookID(book));
    }
  }
  return books;
}

LUXModelTrainer& HelpLUXModel::_collection() {
  if (_trainer == nullptr) {
    _trainer = std::make_unique<LUXModelTrainer>(_language);
  }
  return *_trainer;
}

void HelpLUXModel::reset() {
  {
    const platform::MutexLock lock(_mutex);
    _trainer = std::make_unique<LUXModelTrainer>(_language);
  }
  _file->makeDirectory();
  _file->removeLeftovers();
}

void HelpLUXModel::addHelpbookID(std::string_view helpbookID) {
  const platform::MutexLock lock(_mutex);
  _collection().addBook(helpbookID);
}

void HelpLUXModel::addTokenCounts(const LUXTokenCounts& tokenCounts,
                                  const std::optional<std::string>& forFile,
                                  const std::optional<std::vector<std::string>>& keywords,
                                  std::string_view withBookIdentifier) {
  const platform::MutexLock lock(_mutex);
  _collection().addPage(tokenCounts, forFile, keywords, withBookIdentifier);
}

bool HelpLUXModel::saveWithOptions(const platform::Value& options) {
  std::unique_ptr<LUXModelTrainer> trainer;
  {
    const platform::MutexLock lock(_mutex);
    trainer = std::move(_trainer);
  }
  if (trainer == nullptr) {
    return false;
  }
  std::string reason;
  try {
    const platform::Data data = trainer->finish(options, LUXThreadCount());
    const std::optional<platform::Error> error = _file->write(data);
    if (!error) {
      return true;
    }
    reason = error->description;
  } catch (const platform::Exception& exception) {
    reason = exception.reason();
  }
  platform::Environment::current()->log->write(
      1, fmt::format("Couldn't save the model at {}: {}", _file->path(), reason));
  return false;
}

#include "zebd/Models.h"

#include <filesystem>
#include <system_error>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelFile.h"
#include "host/Luxwell/LUXModelView.h"
#include "platform/Environment.h"
#include "platform/Files.h"

namespace zebd {

namespace {

bool isBeingBuilt(const std::string& folder) {
  return platform::Environment::current()->files->folderIsMarked(folder);
}

ListedModel describe(const std::string& group, const std::string& language) {
  ListedModel listed;
  listed.group = group;
  listed.language = language;
  const std::string folder = HelpLUXModel::directoryPathForModelGroupName(group, language);
  if (const auto model = HelpLUXModel::initWithDirectoryPath(folder, language)) {
    listed.needsBuild = model->needsBuild();
    listed.books = model->allHelpbookIDs();
    if (const auto view = model->view()) {
      listed.pageCount = view->pageCount();
    }
  }
  const std::string file = folder + "/" + LUXModelFile::fileName;
  std::error_code unknown;
  if (const auto size = std::filesystem::file_size(file, unknown); !unknown) {
    listed.bytes = size;
  }
  listed.isBeingBuilt = isBeingBuilt(folder);
  listed.built = platform::Environment::current()->files->modificationDate(file);
  return listed;
}

}  // namespace

std::vector<ListedModel> savedModels() {
  std::vector<ListedModel> models;
  for (const std::string& group : HelpLUXModel::allModelGroupNames()) {
    for (const std::string& language : HelpTokenizer::supportedLocalizations()) {
      if (HelpLUXModel::modelExistsForGroupName(group, language) ||
          isBeingBuilt(HelpLUXModel::directoryPathForModelGroupName(group, language))) {
        models.push_back(describe(group, language));
      }
    }
  }
  return models;
}

}  // namespace zebd

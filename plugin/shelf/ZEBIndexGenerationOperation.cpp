#include "plugin/shelf/ZEBIndexGenerationOperation.h"

#include <exception>
#include <utility>

#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/shelf/ShutdownGuard.h"
#include "plugin/shelf/ZEBIndexshelf.h"

ZEBIndexGenerationOperation::ZEBIndexGenerationOperation(std::shared_ptr<ZEBHelpBook> book,
                                                         std::shared_ptr<ZEBIndex> existingIndex,
                                                         std::shared_ptr<ZEBIndexshelf> indexshelf,
                                                         bool onlyGenerateLUXIndex)
    : _index(std::move(existingIndex)),
      _indexshelf(std::move(indexshelf)),
      _book(std::move(book)),
      _onlyGenerateLUXIndex(onlyGenerateLUXIndex) {
  if (_index) {
    _index->setIsRebuilding(true);
  }
}

std::shared_ptr<ZEBIndexGenerationOperation> ZEBIndexGenerationOperation::init() {
  return initWithBook(nullptr, nullptr, nullptr, false);
}

std::shared_ptr<ZEBIndexGenerationOperation> ZEBIndexGenerationOperation::initWithBook(
    std::shared_ptr<ZEBHelpBook> book, std::shared_ptr<ZEBIndex> existingIndex,
    std::shared_ptr<ZEBIndexshelf> indexshelf, bool onlyGenerateLUXIndex) {
  return std::shared_ptr<ZEBIndexGenerationOperation>(new ZEBIndexGenerationOperation(
      std::move(book), std::move(existingIndex), std::move(indexshelf), onlyGenerateLUXIndex));
}

void ZEBIndexGenerationOperation::main() {
  const ShutdownGuard guard(_indexshelf ? _indexshelf->owner() : nullptr);
  try {
    _generate();
  } catch (const std::exception& exception) {
    ZEBLog(0, "%@", exception);
  }
  // However it ended: a record that stays marked would look busy for ever.
  if (_index) {
    _index->setIsRebuilding(false);
  }
}

void ZEBIndexGenerationOperation::_generate() {
  if (!_indexshelf) {
    return;
  }
  const std::optional<std::string> path =
      _book ? _indexshelf->_generatedIndexPathForBookID(_book->bookID(), _book->localization())
            : std::nullopt;
  if (!_prepareFileAtPath(path)) {
    return;
  }
  const std::shared_ptr<ZEBIndex> made =
      _indexshelf->_generateIndexForBook(_book, path, _onlyGenerateLUXIndex);
  if (!made) {
    return;
  }
  if (_index) {
    // The record stays the one that searches hold; only its contents are new.
    const auto data = platform::Environment::current()->files->contentsMappedAtPath(*path);
    (void)_index->reinitializeWithData(data.value_or(platform::Data()));
  } else {
    _indexshelf->_addIndex(made, _book->bookID());
  }
  _indexshelf->populateRemoteURLOfBook(_book);
  _indexshelf->_notifyObserversOfChange(ZEBIndexChangeUpdated, made);
}

bool ZEBIndexGenerationOperation::_prepareFileAtPath(const std::optional<std::string>& path) {
  const auto files = platform::Environment::current()->files;
  if (!_onlyGenerateLUXIndex || !_index || (path && files->fileExistsAtPath(*path))) {
    return true;
  }
  const std::optional<std::string> source = _index->path();
  if (path) {
    (void)files->createDirectoryWithParents(platform::stringByDeletingLastPathComponent(*path));
    if (source && !files->copyItem(*source, *path)) {
      return true;
    }
  }
  ZEBLog(
      3,
      "Skipping generation of LUX info because if couldn't be copied to the Generated directory. "
      "%@",
      source);
  return false;
}

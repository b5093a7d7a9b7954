// What tests of index records need: a folder with real help-index files, a log that is kept, and an
// owner with books.
#pragma once

#include <gmock/gmock.h>

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "SearchKit/IndexWriter.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/ClassicArchive.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Log.h"
#include "platform/Value.h"
#include "tests/platform/TemporaryFolder.h"

namespace tests {

/// The bytes of a keyword index over the pages.
inline platform::Data keywordIndex(std::vector<searchkit::Document> pages) {
  searchkit::IndexWriter writer;
  for (searchkit::Document& page : pages) {
    writer.add(std::move(page));
  }
  return writer.finish();
}

/// A page with a title, an abstract and a text.
inline searchkit::Document page(std::string path, std::string title, std::string text) {
  searchkit::Document document;
  document.path = std::move(path);
  document.abstract = "About " + title;
  document.title = std::move(title);
  document.body = {std::move(text)};
  return document;
}

/// An anchor dictionary.
inline platform::Value anchors(const std::map<std::string, std::vector<std::string>>& names) {
  platform::Value::Dictionary dictionary;
  for (const auto& [name, paths] : names) {
    dictionary[name] = platform::Value::Array(paths.begin(), paths.end());
  }
  return dictionary;
}

/// Real files, of which every mapping is kept.
class RecordingFileManager : public platform::FailingFileManager {
 public:
  std::optional<platform::Data> contentsMappedAtPath(const std::string& path,
                                                     platform::Error* error) const override {
    std::optional<platform::Data> data = FailingFileManager::contentsMappedAtPath(path, error);
    if (data) {
      mappings.push_back(*data);
    }
    return data;
  }

  mutable std::vector<platform::Data> mappings;
};

/// A temporary folder and an environment whose log and files the test can look into.
class HelpIndexWorld {
 public:
  HelpIndexWorld()
      : log(std::make_shared<platform::CapturingLogSink>()),
        files(std::make_shared<RecordingFileManager>()),
        _override(_environment()) {}

  /// Writes a help-index file and gives its path.
  std::string write(const std::string& name, platform::Value::Dictionary content) const {
    return writeRoot(name, std::move(content));
  }

  /// Writes an archive of any root and gives its path.
  std::string writeRoot(const std::string& name, const platform::Value& root) const {
    return folder.write(name, platform::classicArchiveWithRootObject(root).view());
  }

  TemporaryFolder folder;
  const std::shared_ptr<platform::CapturingLogSink> log;
  const std::shared_ptr<RecordingFileManager> files;

 private:
  platform::Environment _environment() const {
    platform::Environment environment = platform::Environment::system();
    environment.log = log;
    environment.files = files;
    return environment;
  }

  platform::EnvironmentOverride _override;
};

/// A host that knows the books it is told of and answers nothing else of interest.
class BookOwner : public ZEBPluginOwner {
 public:
  std::shared_ptr<ZEBHelpBook> addBook(const std::string& bookID, int32_t type) {
    books[bookID] = ZEBHelpBook::bookWithID(bookID, type, "/books/" + bookID);
    return books[bookID];
  }

  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override {
    if (onBookWithID) {
      onBookWithID();
    }
    const auto found = books.find(bookID);
    return found == books.end() ? nullptr : found->second;
  }

  bool userLoggedIn() const override { return false; }
  bool shouldBeLazy() const override { return true; }
  void setShouldBeLazy(bool) override {}
  bool isOnline() const override { return true; }
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const override { return books; }
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>&) override {}
  void disableShutdown() override {}
  void enableShutdown() override {}
  void setIdleTimeOutDelay(const platform::Value&) override {}
  std::optional<std::string> userHelpCachesDirectoryPath() const override { return std::nullopt; }
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>&, const ZEBResultBatch&,
                          const std::shared_ptr<ZEBQuery>&) override {}
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>&,
                                       const std::shared_ptr<ZEBQuery>&) override {}

  std::map<std::string, std::shared_ptr<ZEBHelpBook>> books;
  std::function<void()> onBookWithID;
};

}  // namespace tests

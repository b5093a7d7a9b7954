// The plug-in as its host runs it, over books of one's own.
#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "platform/Environment.h"
#include "zebd/Owner.h"

class HelpLUXModel;
class ZEBResult;

namespace zebd {
class Host;
}

namespace pipeline {

/// A book that is indexed already. Its pages lie in the folder of the index.
struct Book {
  std::string bookID;
  std::filesystem::path indexFile;
};

/// Indexes the pages of a folder. Throws std::runtime_error when that fails.
void makeIndex(const std::filesystem::path& pages, const std::filesystem::path& indexFile,
               const std::string& language);

/// What one search delivered to the owner, in the order of delivery.
struct Delivery {
  std::vector<std::shared_ptr<ZEBResult>> records;
  /// Of startSearchForQuery() alone.
  double seconds = 0;
};

/// A host with the plug-in's bundle, in the environment that is in force. Thread-safety: confined
/// to the main thread.
class PluginHost {
 public:
  /// Without `byMeaning` nobody is logged in for the plug-in, so that it searches by keywords
  /// alone. Returns when the indexes are known and, by meaning, a model of all the books is saved.
  /// Throws std::runtime_error when that fails.
  PluginHost(const std::vector<Book>& books, bool byMeaning);
  ~PluginHost();
  PluginHost(const PluginHost&) = delete;
  PluginHost& operator=(const PluginHost&) = delete;

  /// Searches all books, as the command line does, or the books of the scope.
  Delivery search(const std::string& text, const std::vector<std::string>& kinds,
                  const std::vector<std::string>& scope = {}) const;

 private:
  std::unique_ptr<zebd::Host> _host;
};

/// An empty caches folder, and readers of one language. One at a time.
class PluginWorld {
 public:
  PluginWorld(const std::filesystem::path& folder, const std::string& language);
  ~PluginWorld();

  /// The model that the plug-in built of the books.
  std::shared_ptr<HelpLUXModel> model() const;

 private:
  platform::EnvironmentOverride _override;
};

}  // namespace pipeline

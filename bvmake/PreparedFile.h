// Files of a book on their way into its index.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "bvmake/FolderWalker.h"
#include "bvmake/Page.h"
#include "platform/Error.h"

namespace platform {
class FileManager;
}

namespace bvmake {

class IncludedFiles;
class Summarizer;

/// Something to tell when its turn comes.
struct Message {
  enum class Kind : uint8_t { warning, progress };

  Kind kind = Kind::warning;
  /// Of progress: from which verbosity on it is told.
  int verbosity = 0;
  std::string text;
};

/// A page with what is shown of it.
struct PreparedPage {
  /// The page's name in the index.
  std::string path;
  /// Never empty.
  std::string title;
  /// Empty when there is none.
  std::string abstract;
  Page page;
};

/// What was found in one file.
struct PreparedFile {
  std::vector<PreparedPage> pages;
  std::vector<Message> messages;
  uint64_t inputBytes = 0;
  /// 1 for a file that could not be read.
  size_t skippedCount = 0;
  /// Pages that hold nothing.
  size_t emptyCount = 0;
};

struct PreparationOptions {
  /// Give pages without a description their first sentences as abstract.
  bool generateSummaries = false;
  /// What progress is told.
  int verbosity = 0;
};

/// Reads files of a book, one after the other. Thread-safety: confined to one thread.
class FilePreparer {
 public:
  /// `folder` is the one that documents may include files of.
  FilePreparer(const PreparationOptions& options, const std::string& folder,
               std::shared_ptr<platform::FileManager> files);
  ~FilePreparer();
  FilePreparer(const FilePreparer&) = delete;
  FilePreparer& operator=(const FilePreparer&) = delete;

  /// A file that cannot be read gives no pages and a warning.
  PreparedFile prepare(const FoundPage& found);

 private:
  bool _read(const FoundPage& found, PreparedFile& file, platform::Error* error);
  bool _readDocBook(const FoundPage& found, std::string_view bytes, PreparedFile& file,
                    platform::Error* error);
  void _addPage(const FoundPage& found, Page page, PreparedFile& file);
  void _tell(int verbosity, std::string text, PreparedFile& file) const;

  const PreparationOptions _options;
  const std::shared_ptr<platform::FileManager> _files;
  const std::unique_ptr<IncludedFiles> _includedFiles;
  const std::unique_ptr<Summarizer> _summarizer;
};

}  // namespace bvmake

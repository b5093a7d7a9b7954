// Has the indexing tool build the index of one book.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Operation.h"

class ZEBHelpBook;
class ZEBIndex;
class ZEBIndexshelf;

/// Runs the tool, then adds the new record to the shelf or pours it into the existing one. While it
/// waits and works, the existing record says that it is being rebuilt.
class ZEBIndexGenerationOperation : public platform::Operation {
 public:
  static std::shared_ptr<ZEBIndexGenerationOperation> init();
  /// `onlyGenerateLUXIndex`: only the semantic data is added, to a copy of the existing record's
  /// file.
  static std::shared_ptr<ZEBIndexGenerationOperation> initWithBook(
      std::shared_ptr<ZEBHelpBook> book, std::shared_ptr<ZEBIndex> existingIndex,
      std::shared_ptr<ZEBIndexshelf> indexshelf, bool onlyGenerateLUXIndex);

  void main() override;

  const std::shared_ptr<ZEBHelpBook>& book() const { return _book; }
  const std::shared_ptr<ZEBIndex>& index() const { return _index; }
  bool onlyGenerateLUXIndex() const { return _onlyGenerateLUXIndex; }

 private:
  ZEBIndexGenerationOperation(std::shared_ptr<ZEBHelpBook> book,
                              std::shared_ptr<ZEBIndex> existingIndex,
                              std::shared_ptr<ZEBIndexshelf> indexshelf, bool onlyGenerateLUXIndex);
  void _generate();
  /// Whether the tool may run: the file that it is to add to is there, or could be copied there.
  bool _prepareFileAtPath(const std::optional<std::string>& path);

  const std::shared_ptr<ZEBIndex> _index;
  const std::shared_ptr<ZEBIndexshelf> _indexshelf;
  const std::shared_ptr<ZEBHelpBook> _book;
  const bool _onlyGenerateLUXIndex;
};

/// The folder whose pages are indexed: for a book in a bundle (types 2 and 3) the folder of the
/// book's localization among the bundle's resources, where there is one, else the resources; for
/// every other book, and a bundle without resources, the book's path.
std::string localizedDocumentRootPath(const ZEBHelpBook& book);

/// 1 if the process's arguments hold the first `count` of `strings` one after the other, else, and
/// on any failure, -1. Prints every argument on standard output on its way.
int pidHasArgs(int processID, const std::vector<std::string>& strings, size_t count);

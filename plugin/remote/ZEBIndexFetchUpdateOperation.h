// Looks for a newer index of an installed book.
#pragma once

#include <memory>
#include <string>

#include "platform/Operation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

/// Hands the fetch to the main thread and waits until it has been started, not until it is over.
class ZEBIndexFetchUpdateOperation : public platform::Operation {
 public:
  static std::shared_ptr<ZEBIndexFetchUpdateOperation> init();
  static std::shared_ptr<ZEBIndexFetchUpdateOperation> initWithIndexshelf(
      std::shared_ptr<ZEBIndexshelf> indexshelf, ZEBIndexFetchParameters params);

  /// The book's own identifier string, null without a book. Its address tells the book.
  const std::string* bookID() const;

  void main() override;

 private:
  ZEBIndexFetchUpdateOperation(std::shared_ptr<ZEBIndexshelf> indexshelf,
                               ZEBIndexFetchParameters params);

  const std::shared_ptr<ZEBIndexshelf> _indexshelf;
  const ZEBIndexFetchParameters _params;
};

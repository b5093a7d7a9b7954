// Asks the remote content service for a book.
#pragma once

#include <memory>

#include "plugin/operations/ZEBOperation.h"
#include "plugin/records/AtomicProperty.h"

class RNXBook;
class ZEBHelpBook;

/// Finishes without asking when the book's remote information names a localization already; else
/// when the service has answered, with its error or with rnxBook() set. An answer that comes after
/// a cancellation finishes the operation once more. Thread-safety: internally synchronised.
class ZEBBookInfoDiscoveryOperation : public ZEBOperation {
 public:
  static std::shared_ptr<ZEBBookInfoDiscoveryOperation> initWithBook(
      std::shared_ptr<ZEBHelpBook> book);

  const std::shared_ptr<ZEBHelpBook>& book() const { return _book; }
  /// The book as the service has it; null until it has answered, and where it has no such book.
  std::shared_ptr<RNXBook> rnxBook() const { return _rnxBook.get(); }

  void main() override;

 private:
  explicit ZEBBookInfoDiscoveryOperation(std::shared_ptr<ZEBHelpBook> book);

  const std::shared_ptr<ZEBHelpBook> _book;
  AtomicProperty<std::shared_ptr<RNXBook>> _rnxBook;
};

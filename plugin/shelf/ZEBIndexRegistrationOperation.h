// Registers one waiting book, after a pause.
#pragma once

#include <memory>

#include "platform/Operation.h"

class ZEBIndexshelf;

/// Carries no book: it registers whichever one is next when its turn comes, or none.
class ZEBIndexRegistrationOperation : public platform::Operation {
 public:
  static std::shared_ptr<ZEBIndexRegistrationOperation> init();
  static std::shared_ptr<ZEBIndexRegistrationOperation> initWithIndexshelf(
      std::shared_ptr<ZEBIndexshelf> indexshelf);

  void main() override;

 private:
  explicit ZEBIndexRegistrationOperation(std::shared_ptr<ZEBIndexshelf> indexshelf);

  const std::shared_ptr<ZEBIndexshelf> _indexshelf;
};

// Keeps the daemon from exiting for the length of a scope.
#pragma once

#include <memory>
#include <utility>

#include "host/Zebrine/ZEBPluginOwner.h"

/// Pairs disableShutdown() with enableShutdown(), also when the scope is left by an exception. An
/// absent owner is told nothing.
class ShutdownGuard {
 public:
  explicit ShutdownGuard(std::shared_ptr<ZEBPluginOwner> owner) : _owner(std::move(owner)) {
    if (_owner) {
      _owner->disableShutdown();
    }
  }
  ~ShutdownGuard() {
    if (_owner) {
      _owner->enableShutdown();
    }
  }
  ShutdownGuard(const ShutdownGuard&) = delete;
  ShutdownGuard& operator=(const ShutdownGuard&) = delete;

 private:
  const std::shared_ptr<ZEBPluginOwner> _owner;
};

// Tells when something changes in folders.
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace zebd {

/// Watches folders of the file system by inotify. It does not say what has changed, only that
/// something has, once it has been quiet there for a while (`calm`), or kept changing for long.
///
/// Symbolic links below a folder are not followed. Where the kernel has no room for further
/// watches, or a tree has more folders than maximumFolderCount, the rest is not watched; that is
/// logged at level 2.
/// Thread-safety: confined to the main thread, which has to run its loop.
class FolderWatcher {
 public:
  static constexpr size_t maximumFolderCount = 20'000;

  /// `changed` is called on the main thread.
  explicit FolderWatcher(std::function<void()> changed);
  ~FolderWatcher();
  FolderWatcher(const FolderWatcher&) = delete;
  FolderWatcher& operator=(const FolderWatcher&) = delete;

  /// Watches these from now on, and nothing else: what is directly in `folders`, and in `trees` and
  /// below. In place of a folder that is not there, the nearest one above it is watched. What lies
  /// in both is watched once.
  void watch(const std::vector<std::string>& folders, const std::vector<std::string>& trees);

  /// How many folders are being watched.
  size_t count() const;

 private:
  struct Implementation;
  const std::shared_ptr<Implementation> _implementation;
};

}  // namespace zebd

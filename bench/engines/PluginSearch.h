// The plug-in's own keyword search over the same books, records and all.
#pragma once

#include <cstddef>
#include <memory>
#include <string>

#include "bench/engines/Engine.h"

namespace engines {

/// Help-index files around the keyword indexes of a folder, and a controller that searches them as
/// in a running daemon: every record known, no index open between searches.
class PluginSearch {
 public:
  PluginSearch(const Images& indexes, const std::string& folder);
  ~PluginSearch();
  PluginSearch(const PluginSearch&) = delete;
  PluginSearch& operator=(const PluginSearch&) = delete;

  /// Both passes; how many records came back.
  size_t search(const std::string& text);

 private:
  struct World;
  std::unique_ptr<World> _world;
};

}  // namespace engines

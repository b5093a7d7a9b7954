// Something that keeps help from being found.
#pragma once

#include <optional>
#include <string>

namespace zeb {

struct Finding {
  /// What it is, for programs: one of the names in zeb(1), DIAGNOSTICS.
  std::string name;
  /// The book that it is about; absent for what concerns all of them.
  std::optional<std::string> bookID;
  /// The file or folder that it is about, where there is one.
  std::optional<std::string> path;
  std::string text;
  /// What helps.
  std::string advice;
};

}  // namespace zeb

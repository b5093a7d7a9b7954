// Paths as the user types them.
#pragma once

#include <string>

namespace zeb {

/// The path from the root, without empty and dot components. Does not look at the disk beyond
/// asking for the working folder.
std::string absolutePath(const std::string& path);

}  // namespace zeb

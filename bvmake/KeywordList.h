// The lists of keywords that authors give their pages.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace bvmake {

/// Appends the entries of a list whose entries are set apart by commas or semicolons, of any
/// script.
void addKeywords(std::string_view list, std::vector<std::string>& keywords);

}  // namespace bvmake

// Many real pages, for measuring speed.
#pragma once

#include <cstddef>
#include <filesystem>
#include <string>
#include <vector>

#include "bench/quality/Collection.h"

namespace quality {

/// The pages below `roots`, whatever books they belong to, in an order that has nothing to do with
/// where they lie, so that the first n are a sample. At most `count`.
Collection pageSample(const std::vector<std::string>& roots, size_t count);

/// What people might ask for: in turns a title, and two to six words that follow one another in
/// some page. The same for the same pages.
std::vector<std::string> sampleQueries(const Collection& pages, size_t count);

/// Beginnings of titles, three to eight letters long.
std::vector<std::string> samplePrefixes(const Collection& pages, size_t count);

}  // namespace quality

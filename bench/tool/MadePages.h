// Pages that are made for a measurement.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace bench {

/// Fills a new folder with HTML pages of about `bytes` bytes each, a thousand in a sub-folder,
/// whose words are as frequent as those of a language. The same every time.
void makePages(const std::string& folder, size_t count, size_t bytes);

}  // namespace bench

// Pages and models for the tests of models.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/LUXModelTrainer.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXTokenCounts.h"
#include "platform/Data.h"
#include "platform/Value.h"

class HelpLUXModel;

namespace tests {

struct ModelPage {
  std::string book;
  /// Empty for a page that is not to be found.
  std::string key;
  std::string title;
  std::string body;
};

/// The counts of the pages, by book, as the indexing tool makes them.
std::vector<LUXTokenCounts> countsOfPages(const std::vector<ModelPage>& pages,
                                          const std::string& language = "English");

/// A model of the pages. Books without a page that may be found are not added.
platform::Data modelOfPages(const std::vector<ModelPage>& pages, size_t threadCount = 2,
                            const platform::Value& options = {},
                            const std::string& language = "English");

/// The same through the class that hosts use, without saving.
void addPages(HelpLUXModel& model, const std::vector<ModelPage>& pages);

std::shared_ptr<const LUXModelView> viewOfPages(const std::vector<ModelPage>& pages);

/// Pages of `wordCount` words from a vocabulary in which few words are frequent; the same for the
/// same seed. Books "first" and "second", titles of up to three words, every eighth page not to be
/// found.
std::vector<ModelPage> randomModelPages(size_t count, size_t wordCount, unsigned seed);

/// A handful of pages that use every part of the format.
std::vector<ModelPage> samplePages();

}  // namespace tests

// Small models for the tests of queries, made as the plug-in makes them.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXQueryTerms.h"
#include "host/Luxwell/LUXTokenCounts.h"
#include "tests/platform/TemporaryFolder.h"

namespace tests {

struct QueryPage {
  std::string key;
  std::string title;
  std::vector<std::string> blocks;
  std::string book = "org.zeb.manual";
  bool excludedFromSearch = false;
};

/// Pages with the counts of their tokens and the model that was made of them, in a folder of its
/// own.
class QueryWorld {
 public:
  explicit QueryWorld(std::vector<QueryPage> pages, const std::string& language = "English");

  const std::vector<QueryPage>& pages() const { return _pages; }
  const std::vector<LUXTokenCounts>& counts() const { return _counts; }
  const std::shared_ptr<HelpLUXModel>& model() const { return _model; }
  const std::shared_ptr<const LUXModelView>& view() const { return _view; }
  const HelpTokenizer& tokenizer() const { return *_tokenizer; }
  std::string modelPath() const { return _folder.path("model"); }

  LUXQueryTerms termsOf(std::string_view text) const {
    return LUXQueryTerms::termsOfText(*_tokenizer, text, {});
  }

 private:
  const TemporaryFolder _folder;
  const std::vector<QueryPage> _pages;
  const std::shared_ptr<const HelpTokenizer> _tokenizer;
  std::vector<LUXTokenCounts> _counts;
  std::shared_ptr<HelpLUXModel> _model;
  std::shared_ptr<const LUXModelView> _view;
};

/// `count` pages of words drawn from a vocabulary in which a few words are frequent and most are
/// rare, with titles. The same for the same seed. Some pages are excluded from search.
std::vector<QueryPage> randomPages(size_t count, unsigned seed);

/// A word of that vocabulary; low numbers are frequent words.
std::string vocabularyWord(size_t number);
inline constexpr size_t vocabularySize = 400;

/// Pages about printers, networks and cooking.
std::vector<QueryPage> officePages();

}  // namespace tests

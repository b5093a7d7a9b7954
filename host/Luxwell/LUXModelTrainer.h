// Collects the pages of a group's books for a model.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/LUXTokenCounts.h"
#include "host/Luxwell/LUXTrainingData.h"
#include "platform/Data.h"
#include "platform/Value.h"

/// Takes pages and makes the bytes of a model of them. The same books and pages in the same order
/// give the same bytes, whatever the number of threads. Thread-safety: confined to one thread.
class LUXModelTrainer {
 public:
  /// `language` is a folder name.
  explicit LUXModelTrainer(std::string language);

  /// A book whose pages may be found, full identifier. A second time it changes nothing.
  void addBook(std::string_view bookID);

  /// A page. Without a key it lends the model its words and is never found; with one, its book is
  /// added as well. Keywords count as words of the title. The table of the counts is kept alive
  /// until a page with another one comes. Throws platform::Exception "InvalidArgumentException"
  /// when there are more tokens than a model can have; the model is of no use then.
  void addPage(const LUXTokenCounts& tokenCounts, const std::optional<std::string>& key,
               const std::optional<std::vector<std::string>>& keywords, std::string_view bookID);

  const std::vector<std::string>& books() const noexcept { return _data.books; }
  size_t pageCount() const noexcept { return _data.pages.size(); }

  /// The bytes; the trainer is used up. `options` are kept in the model; of them
  /// "SuggestionThresholdsPerBook" says which phrases are good enough to be suggested: phrases of
  /// one or two words need a book in which their score reaches "BigramThreshold", longer ones
  /// "TrigramThreshold". Throws platform::Exception "InvalidArgumentException" for options that no
  /// property list can hold and for more pages or postings than a model can have.
  platform::Data finish(const platform::Value& options, size_t threadCount);

 private:
  uint32_t _bookNumber(std::string_view bookID);
  uint32_t _tokenNumber(const LUXTokenCount& count);
  void _addKeywords(const std::vector<std::string>& keywords);

  LUXTrainingData _data;
  std::shared_ptr<const LUXTokenTable> _table;
  /// The numbers of the table's tokens here, as far as they have occurred.
  std::vector<uint32_t> _numbers;
};

// Makes a model of token counts.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "host/Luxwell/LUXSectionsWriter.h"
#include "host/Luxwell/LUXTrainingData.h"
#include "platform/Data.h"
#include "platform/Value.h"

/// Orders pages and terms, weighs postings, factorises, and finds what can be suggested, one after
/// the other; each step uses up to `threadCount` threads. Thread-safety: confined to one thread.
class LUXModelAssembler {
 public:
  LUXModelAssembler(LUXTrainingData data, size_t threadCount);

  /// See LUXModelTrainer::finish(). Used up by it.
  platform::Data assemble(const platform::Value& options);

 private:
  void _orderPages();
  void _addNumbers(LUXSectionsWriter& writer, uint32_t phraseCount) const;
  void _addBooksAndPages();
  void _orderTerms();
  void _orderPairs();
  void _addPostings(LUXTokenKind kind);
  void _addMeaning();
  void _addNeighbourhoods(const std::vector<int8_t>& vectors, const std::vector<float>& scales);

  LUXTrainingData _data;
  const size_t _threadCount;
  LUXSectionsWriter _writer;
  /// The pages by their number in the model: those that may be found, by book, then the others.
  std::vector<uint32_t> _pages;
  size_t _shownCount = 0;
  /// Numbers of tokens in the model, by kind.
  std::array<std::vector<uint32_t>, LUXTokenKindCount> _termNumbers;
  /// In how many pages each stem is.
  std::vector<uint32_t> _stemFrequencies;
  uint32_t _rank = 0;
  uint32_t _stride = 0;
  uint32_t _termVectorCount = 0;
};

// The phrases of a model that are offered as suggestions.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/Luxwell/LUXPhraseScore.h"
#include "host/Luxwell/LUXSectionsWriter.h"
#include "host/Luxwell/LUXTrainingData.h"
#include "platform/Value.h"

class LUXModelView;

/// Counts phrases over all books. Phrases that differ only in what a search overlooks are one,
/// shown as it is most often written. What is in too few pages, or in no page that may be found, or
/// in no book good enough for the book's own thresholds, is left out. Thread-safety: confined to
/// one thread.
class LUXModelPhrases {
 public:
  /// A phrase that is offered.
  struct Phrase {
    std::string foldedText;
    std::string text;
    LUXPhraseStatistics statistics;
    double score = 0;
    /// Those that hold it in a page that may be found, rising.
    std::vector<uint32_t> books;
  };

  /// `data` must outlive this object.
  LUXModelPhrases(const LUXTrainingData& data, size_t threadCount);

  /// In order of folded text. `thresholds` are a dictionary by book of dictionaries with
  /// "BigramThreshold" and "TrigramThreshold"; what is not there is 0.
  std::vector<Phrase> phrases(const platform::Value& thresholds) const;

  /// Looks up what each phrase finds in the model without phrases that `view` is, and adds all
  /// sections of the phrases.
  static void addSections(std::vector<Phrase> phrases, const LUXTrainingData& data,
                          const LUXModelView& view, size_t threadCount, LUXSectionsWriter& writer);

 private:
  static constexpr uint32_t none = LUXStringNumbering::none;

  void _foldTokens();
  void _findParts();
  template <typename Body>
  void _forEachCount(size_t page, const Body& body) const;

  const LUXTrainingData& _data;
  const size_t _threadCount;
  /// Folded texts; a phrase is known by its number among them.
  LUXStringNumbering _folded;
  /// The phrase that each token is; none for what is no phrase.
  std::vector<uint32_t> _phraseOfToken;
  std::vector<uint32_t> _lengths;
  /// The shorter phrases that each phrase holds.
  std::vector<size_t> _partStarts{0};
  std::vector<uint32_t> _parts;
  /// The forms of the phrase's words.
  std::vector<size_t> _wordStarts{0};
  std::vector<uint32_t> _words;
  LUXStringNumbering _forms;
};

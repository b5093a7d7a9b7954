#include "host/Luxwell/LUXQueryTerms.h"

#include <unicode/uchar.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <unordered_map>
#include <utility>

namespace {

// Texts are taken apart in pieces of about this many bytes, so that a cancelled query ends soon.
constexpr size_t pieceLength = 4096;
// Nothing longer is compared with titles or completed.
constexpr size_t longestTitle = 512;

// Adds tokens to a list, each once. Short lists are searched as they are.
class Collector {
 public:
  explicit Collector(std::vector<LUXQueryTerms::Term>& terms) : _terms(terms) {}

  void add(std::string token) {
    if (_terms.size() < mapSize) {
      for (LUXQueryTerms::Term& term : _terms) {
        if (term.token == token) {
          ++term.count;
          return;
        }
      }
    } else {
      if (_places.empty()) {
        for (size_t i = 0; i < _terms.size(); ++i) {
          _places.emplace(_terms[i].token, i);
        }
      }
      const auto [place, isNew] = _places.emplace(token, _terms.size());
      if (!isNew) {
        ++_terms[place->second].count;
        return;
      }
    }
    _terms.push_back({std::move(token), 1});
  }

 private:
  static constexpr size_t mapSize = 16;

  std::vector<LUXQueryTerms::Term>& _terms;
  std::unordered_map<std::string, size_t> _places;
};

// Where to cut a piece off: behind the last blank, where there is one, else before a character.
size_t endOfPiece(std::string_view text) {
  if (text.size() <= pieceLength) {
    return text.size();
  }
  const size_t blank = text.find_last_of(" \t\r\n", pieceLength);
  if (blank != std::string_view::npos && blank > 0) {
    return blank;
  }
  size_t end = pieceLength;
  while (end > pieceLength - 4 && (static_cast<uint8_t>(text[end]) & 0xC0) == 0x80) {
    --end;
  }
  return end;
}

// Whether the last character belongs to a word, so that more of the word may follow.
bool endsInsideWord(std::string_view text) {
  if (text.empty()) {
    return false;
  }
  const auto length = static_cast<int32_t>(std::min<size_t>(text.size(), 8));
  const auto* tail = reinterpret_cast<const uint8_t*>(text.data() + text.size()) - length;
  int32_t at = length;
  UChar32 character = 0;
  U8_PREV(tail, 0, at, character);
  return character >= 0 && (u_isalnum(character) || (U_GET_GC_MASK(character) & U_GC_M_MASK) != 0);
}

void addBigrams(const std::vector<HelpTokenizer::Word>& words,
                std::vector<LUXQueryTerms::Term>& terms) {
  Collector bigrams(terms);
  const HelpTokenizer::Word* former = nullptr;
  for (const HelpTokenizer::Word& word : words) {
    if (word.isStopWord) {
      former = nullptr;
      continue;
    }
    if (former != nullptr && !word.breaksChain) {
      bigrams.add(former->stem + ' ' + word.stem);
    }
    former = &word;
  }
}

}  // namespace

LUXQueryTerms LUXQueryTerms::termsOfText(const HelpTokenizer& tokenizer, std::string_view text,
                                         const LUXIsCancelled& isCancelled) {
  LUXQueryTerms terms;
  std::vector<HelpTokenizer::Word> words;
  for (std::string_view rest = text; !rest.empty();) {
    if (isCancelled && isCancelled()) {
      return terms;
    }
    const size_t end = endOfPiece(rest);
    tokenizer.wordsOfText(rest.substr(0, end), words);
    rest.remove_prefix(end);
  }
  if (words.empty()) {
    return terms;
  }
  terms.onlyStopWords = std::all_of(
      words.begin(), words.end(), [](const HelpTokenizer::Word& word) { return word.isStopWord; });
  Collector stems(terms.stems);
  Collector forms(terms.forms);
  const bool isShort = text.size() <= longestTitle;
  for (const HelpTokenizer::Word& word : words) {
    if (isShort) {
      HelpTokenizer::appendToDisplay(terms.foldedText, word.form);
      terms.wordStarts.push_back(terms.foldedText.size() - word.form.size());
    }
    if (!word.wholeForm.empty()) {
      forms.add(word.wholeForm);
    }
    if (word.isStopWord && !terms.onlyStopWords) {
      continue;
    }
    if (isShort) {
      if (!terms.normalizedTitle.empty()) {
        terms.normalizedTitle += ' ';
      }
      terms.normalizedTitle += terms.onlyStopWords ? word.form : word.stem;
    }
    stems.add(word.stem);
    forms.add(word.form);
  }
  addBigrams(words, terms.bigrams);
  if (!endsInsideWord(text)) {
    if (isShort) {
      terms.foldedText += ' ';
    }
  } else if (!words.back().isStopWord) {
    terms.unfinishedForm = words.back().form;
    terms.unfinishedStem = words.back().stem;
  }
  return terms;
}

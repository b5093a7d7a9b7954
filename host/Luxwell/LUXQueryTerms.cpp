#include "host/Luxwell/LUXQueryTerms.h"

#include <unicode/uchar.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <optional>
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

  // The token's place in the list.
  uint32_t add(std::string token) {
    const size_t place = _find(token);
    if (place < _terms.size()) {
      ++_terms[place].count;
    } else {
      _terms.push_back({std::move(token), 1});
    }
    return static_cast<uint32_t>(place);
  }

 private:
  static constexpr size_t longestSearched = 16;

  // The end of the list for a token that is new, which is put there next.
  size_t _find(const std::string& token) {
    if (_terms.size() < longestSearched) {
      const auto found =
          std::find_if(_terms.begin(), _terms.end(),
                       [&](const LUXQueryTerms::Term& term) { return term.token == token; });
      return static_cast<size_t>(found - _terms.begin());
    }
    for (size_t i = _places.size(); i < _terms.size(); ++i) {
      _places.emplace(_terms[i].token, i);
    }
    return _places.emplace(token, _terms.size()).first->second;
  }

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

void addFolded(const std::string& form, LUXQueryTerms& terms) {
  HelpTokenizer::appendToDisplay(terms.foldedText, form);
  terms.wordStarts.push_back(terms.foldedText.size() - form.size());
}

// Makes one of equal pairs.
void countPairs(std::vector<LUXQueryTerms::Pair>& pairs) {
  std::sort(pairs.begin(), pairs.end(), [](const auto& a, const auto& b) {
    return a.first != b.first ? a.first < b.first : a.second < b.second;
  });
  size_t kept = 0;
  for (size_t i = 0; i < pairs.size(); ++i) {
    if (kept > 0 && pairs[kept - 1].first == pairs[i].first &&
        pairs[kept - 1].second == pairs[i].second) {
      ++pairs[kept - 1].count;
    } else {
      pairs[kept++] = pairs[i];
    }
  }
  pairs.resize(kept);
}

// Of an ASCII letter or a character beyond ASCII.
bool isLetterOrLater(char byte) {
  const auto value = static_cast<unsigned char>(byte);
  return value >= 0x80 || (value >= 'a' && value <= 'z') || (value >= 'A' && value <= 'Z');
}

bool isOperatorWord(std::string_view word) {
  const char first = word.front();
  const bool isPrefixed = word.size() > 1 && (first == '-' || first == '!' || first == '+') &&
                          (word[1] == '"' || word[1] == '(' || isLetterOrLater(word[1]));
  const bool isStarred = word.size() > 1 && word.back() == '*' && first != '*';
  return isPrefixed || isStarred || word == "|";
}

}  // namespace

bool LUXQueryHasOperators(std::string_view text) {
  constexpr size_t mostWords = 8;
  constexpr std::string_view blanks = " \t\r\n";
  if (text.size() > longestTitle) {
    return false;
  }
  size_t words = 0;
  bool found = std::count(text.begin(), text.end(), '"') >= 2;
  for (size_t start = text.find_first_not_of(blanks); start != std::string_view::npos;) {
    const size_t end = std::min(text.find_first_of(blanks, start), text.size());
    ++words;
    found = found || isOperatorWord(text.substr(start, end - start));
    start = text.find_first_not_of(blanks, end);
  }
  return found && words <= mostWords;
}

LUXQueryTerms LUXQueryTerms::foldedTextOf(const HelpTokenizer& tokenizer, std::string_view text) {
  LUXQueryTerms terms;
  if (text.size() > longestTitle) {
    return terms;
  }
  std::vector<HelpTokenizer::Segment> segments;
  std::string buffer;
  tokenizer.segmentsOfText(text, segments, buffer);
  for (const HelpTokenizer::Segment& segment : segments) {
    if (const std::string form = tokenizer.formOfSurface(segment.surface); !form.empty()) {
      addFolded(form, terms);
    }
  }
  if (!terms.wordStarts.empty() && !endsInsideWord(text)) {
    terms.foldedText += ' ';
  }
  return terms;
}

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
  const bool isFinished = !endsInsideWord(text);
  if (!isFinished && !words.back().isStopWord) {
    terms.unfinishedForm = words.back().form;
    terms.unfinishedStem = words.back().stem;
  }
  terms.stems.reserve(words.size());
  terms.forms.reserve(words.size());
  Collector stems(terms.stems);
  Collector forms(terms.forms);
  const bool isShort = text.size() <= longestTitle;
  // The place of the word before this one, where nothing stands between them.
  std::optional<uint32_t> former;
  for (HelpTokenizer::Word& word : words) {
    if (isShort) {
      addFolded(word.form, terms);
    }
    if (!word.wholeForm.empty()) {
      forms.add(std::move(word.wholeForm));
    }
    if (word.isStopWord && !terms.onlyStopWords) {
      former.reset();
      continue;
    }
    if (isShort) {
      if (!terms.normalizedTitle.empty()) {
        terms.normalizedTitle += ' ';
      }
      terms.normalizedTitle += terms.onlyStopWords ? word.form : word.stem;
    }
    const uint32_t place = stems.add(std::move(word.stem));
    forms.add(std::move(word.form));
    if (former && !word.breaksChain && !terms.onlyStopWords) {
      terms.bigrams.push_back({*former, place, 1});
    }
    former = place;
  }
  countPairs(terms.bigrams);
  if (isFinished && isShort) {
    terms.foldedText += ' ';
  }
  return terms;
}

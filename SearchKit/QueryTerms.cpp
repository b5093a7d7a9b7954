#include "SearchKit/QueryTerms.h"

#include <string>
#include <utility>
#include <vector>

#include "SearchKit/TextFolding.h"

namespace searchkit {
namespace {

// A run of letters, with the stars that touch it and what is on their other side.
struct Part {
  TermPattern pattern;
  bool isUnspaced = false;
  // The dictionary's words; filled for unspaced runs only.
  std::vector<std::string> words;
};

class PartReader {
 public:
  std::vector<Part> read(std::string_view text) {
    bool isAfterStar = false;
    for (size_t begin = 0;;) {
      const size_t star = text.find('*', begin);
      if (star != begin) {
        _readPiece(text.substr(begin, star - begin), isAfterStar);
      }
      if (star == std::string_view::npos) {
        return std::move(_parts);
      }
      if (_lastTouchesEnd) {
        _parts.back().pattern.isOpenAtEnd = true;
      }
      isAfterStar = true;
      begin = star + 1;
    }
  }

 private:
  // `text` is what lies between two stars, and never empty.
  void _readPiece(std::string_view text, bool isAfterStar) {
    _folded.clear();
    _runs.clear();
    foldText(text, _folded);
    findRuns(_folded, _runs);
    for (const Run& run : _runs) {
      const auto letters = std::u16string_view(_folded).substr(run.begin, run.end - run.begin);
      const bool touchesStar = isAfterStar && run.begin == 0;
      std::string term = termFromFolded(letters);
      if (touchesStar && _lastTouchesEnd) {
        Part& part = _parts.back();
        part.pattern.pieces.push_back(std::move(term));
        part.pattern.isOpenAtEnd = false;
        part.isUnspaced = run.unspaced;
        part.words.clear();
      } else {
        Part part;
        part.pattern.pieces.push_back(std::move(term));
        part.pattern.isOpenAtStart = touchesStar;
        part.isUnspaced = run.unspaced;
        if (run.unspaced && !touchesStar) {
          _readWords(letters, part.words);
        }
        _parts.push_back(std::move(part));
      }
      // Only the first run of a piece can touch the star before it.
      _lastTouchesEnd = false;
    }
    _lastTouchesEnd = !_runs.empty() && _runs.back().end == _folded.size();
  }

  static void _readWords(std::u16string_view letters, std::vector<std::string>& words) {
    std::vector<size_t> ends;
    findWordEnds(letters, ends);
    size_t begin = 0;
    for (const size_t end : ends) {
      words.push_back(termFromFolded(letters.substr(begin, end - begin)));
      begin = end;
    }
  }

  std::u16string _folded;
  std::vector<Run> _runs;
  std::vector<Part> _parts;
  bool _lastTouchesEnd = false;
};

bool isLongPattern(const TermPattern& pattern) { return !pattern.isExact() && !pattern.isPrefix(); }

// The slots of all parts, one word after the other. Words that the index left out leave a gap.
std::vector<PhraseSlot> slotsOfParts(const std::vector<Part>& parts, const Tokenizer& tokenizer) {
  std::vector<PhraseSlot> slots;
  uint32_t offset = 0;
  const auto add = [&](TermPattern pattern, bool isUnspaced) {
    const bool isMissing = pattern.isExact() && tokenizer.isShort(pattern.pieces[0], isUnspaced);
    if (!isMissing) {
      slots.push_back({std::move(pattern), offset});
    }
    ++offset;
  };
  for (const Part& part : parts) {
    if (part.words.size() < 2) {
      add(part.pattern, part.isUnspaced);
      continue;
    }
    for (size_t i = 0; i < part.words.size(); ++i) {
      const bool isLast = i + 1 == part.words.size();
      add({{part.words[i]}, false, isLast && part.pattern.isOpenAtEnd}, true);
    }
  }
  return slots;
}

// Drops the slots that are too many, and takes the others from the allowance.
void charge(std::vector<PhraseSlot>& slots, QueryAllowance& allowance) {
  const bool isPhrase = slots.size() > 1;
  std::erase_if(slots, [&](const PhraseSlot& slot) {
    const bool isScan = isLongPattern(slot.pattern) || (isPhrase && !slot.pattern.isExact());
    if (allowance.terms == 0 || (isScan && allowance.scans == 0)) {
      return true;
    }
    --allowance.terms;
    allowance.scans -= isScan ? 1 : 0;
    return false;
  });
}

}  // namespace

QueryNode queryTermsFromText(std::string_view text, bool isOpenAtEnd, const Tokenizer& tokenizer,
                             QueryAllowance& allowance) {
  QueryNode node;
  std::vector<Part> parts = PartReader().read(text);
  if (parts.empty()) {
    return node;
  }
  // Where no blanks end words, the user cannot tell where one ends either.
  Part& last = parts.back();
  last.pattern.isOpenAtEnd = last.pattern.isOpenAtEnd || isOpenAtEnd || last.isUnspaced;
  node.slots = slotsOfParts(parts, tokenizer);
  charge(node.slots, allowance);
  if (parts.size() == 1) {
    const TermPattern& pattern = parts[0].pattern;
    node.mayBeLeftOut =
        !isLongPattern(pattern) && tokenizer.isShort(pattern.pieces[0], parts[0].isUnspaced);
    if (node.slots.size() > 1 && allowance.terms > 0) {
      // The same letters may be one word where there are others around them.
      QueryNode whole;
      whole.slots.push_back({pattern, 0});
      charge(whole.slots, allowance);
      QueryNode either;
      either.optional.push_back(std::move(whole));
      either.optional.push_back(std::move(node));
      return either;
    }
  }
  // A phrase begins with its first slot, whatever was left out before that.
  for (size_t i = node.slots.size(); i-- > 0;) {
    node.slots[i].offset -= node.slots[0].offset;
  }
  return node;
}

}  // namespace searchkit

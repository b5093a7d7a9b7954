#include "host/Luxwell/LUXIndexWriter.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <functional>
#include <limits>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXNumbers.h"
#include "host/Luxwell/LUXPhraseFinder.h"
#include "host/Luxwell/LUXPhraseScore.h"
#include "host/Luxwell/LUXSectionedData.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"

using luxnumbers::appendUInt32;
using luxnumbers::appendVarnumber;

namespace {

constexpr uint32_t none = 0xFFFFFFFF;

struct TextHash {
  using is_transparent = void;
  size_t operator()(std::string_view text) const noexcept {
    return std::hash<std::string_view>()(text);
  }
};

// Strings by number, in the order in which they came.
class Names {
 public:
  uint32_t numberOf(std::string_view name) {
    const auto found = _numbers.find(name);
    if (found != _numbers.end()) {
      return found->second;
    }
    const auto number = static_cast<uint32_t>(_names.size());
    const auto added = _numbers.emplace(std::string(name), number).first;
    _names.push_back(&added->first);
    return number;
  }
  size_t count() const noexcept { return _names.size(); }
  const std::string& operator[](size_t number) const noexcept { return *_names[number]; }

 private:
  std::unordered_map<std::string, uint32_t, TextHash, std::equal_to<>> _numbers;
  std::vector<const std::string*> _names;
};

// A word as it is written.
struct Surface {
  // None for what leaves nothing when it is folded.
  uint32_t form = none;
  uint32_t stem = none;
  bool isStopWord = false;
  bool isLowerCase = false;
  uint32_t count = 0;
};

struct Document {
  LUXDocument document;
  // Numbers of surfaces.
  LUXWordSequence sequence;
};

struct Entry {
  uint32_t token = 0;
  bool inTitle = false;
};

// The numbers that tokens of one kind get when they are put in order.
struct Order {
  std::vector<std::string> sorted;
  std::vector<uint32_t> numberOf;
};

Order orderOf(const std::vector<std::string>& tokens, uint32_t start) {
  std::vector<uint32_t> positions(tokens.size());
  for (uint32_t i = 0; i < positions.size(); ++i) {
    positions[i] = i;
  }
  std::sort(positions.begin(), positions.end(),
            [&](uint32_t a, uint32_t b) { return tokens[a] < tokens[b]; });
  Order order;
  order.numberOf.resize(tokens.size());
  for (const uint32_t position : positions) {
    if (order.sorted.empty() || order.sorted.back() != tokens[position]) {
      order.sorted.push_back(tokens[position]);
    }
    order.numberOf[position] = start + static_cast<uint32_t>(order.sorted.size() - 1);
  }
  return order;
}

// A section of records: their number, their offsets, their bytes.
class RecordsWriter {
 public:
  std::string& beginRecord() {
    _offsets.push_back(_bytes.size());
    return _bytes;
  }

  LUXSection section(uint32_t type) {
    _offsets.push_back(_bytes.size());
    if (_bytes.size() > std::numeric_limits<uint32_t>::max()) {
      throw platform::Exception(platform::invalidArgumentException,
                                "a book too large for semantic data");
    }
    std::string out;
    out.reserve(4 * (_offsets.size() + 1) + _bytes.size());
    appendUInt32(out, static_cast<uint32_t>(_offsets.size() - 1));
    for (const uint64_t offset : _offsets) {
      appendUInt32(out, static_cast<uint32_t>(offset));
    }
    out += _bytes;
    return LUXSection::sectionWithBytes(type, platform::Data::adopt(std::move(out)));
  }

 private:
  std::vector<uint64_t> _offsets;
  std::string _bytes;
};

// The score of the last phrase of this length that still gets into a budget of one a page; 0 where
// all do.
double thresholdOf(const std::vector<LUXPhrase>& phrases, uint32_t length, size_t pageCount) {
  std::vector<double> scores;
  for (const LUXPhrase& phrase : phrases) {
    if (phrase.statistics.length == length &&
        phrase.statistics.pageCount >= LUXPhraseMinimumPageCount) {
      scores.push_back(LUXPhraseScore(phrase.statistics));
    }
  }
  if (pageCount == 0 || scores.size() <= pageCount) {
    return 0;
  }
  const auto last = scores.begin() + static_cast<std::ptrdiff_t>(pageCount - 1);
  std::nth_element(scores.begin(), last, scores.end(), std::greater<>());
  return *last;
}

}  // namespace

struct LUXIndexWriter::Implementation {
  std::shared_ptr<const HelpTokenizer> tokenizer;
  std::unordered_set<std::string> keys;
  std::vector<Document> documents;
  Names surfaceNames;
  std::vector<Surface> surfaces;
  Names forms;
  Names stems;
  std::vector<HelpTokenizer::Segment> segments;
  std::string buffer;

  uint32_t surfaceNumber(std::string_view text) {
    const uint32_t number = surfaceNames.numberOf(text);
    if (number == surfaces.size()) {
      Surface surface;
      if (const auto word = tokenizer->wordOfSurface(text)) {
        surface.form = forms.numberOf(word->form);
        surface.stem = stems.numberOf(word->stem);
        surface.isStopWord = word->isStopWord;
        surface.isLowerCase = platform::lowercaseString(text) == text;
      }
      surfaces.push_back(surface);
    }
    ++surfaces[number].count;
    return number;
  }

  void addText(std::string_view text, LUXWordSequence& sequence) {
    segments.clear();
    tokenizer->segmentsOfText(text, segments, buffer);
    bool breaks = true;
    for (const HelpTokenizer::Segment& segment : segments) {
      breaks = breaks || segment.breaksChain;
      const uint32_t number = surfaceNumber(segment.surface);
      if (surfaces[number].form != none) {
        sequence.words.push_back({number, breaks});
        breaks = false;
      }
    }
  }

  // How each form is shown: as it is written where it is not at the beginning of a sentence, as far
  // as one can know: in small letters if it ever is.
  std::vector<uint32_t> displaySurfaces() const {
    std::vector<uint32_t> best(forms.count(), none);
    for (uint32_t number = 0; number < surfaces.size(); ++number) {
      const Surface& surface = surfaces[number];
      if (surface.form == none) {
        continue;
      }
      uint32_t& chosen = best[surface.form];
      if (chosen == none || isBetterDisplay(number, chosen)) {
        chosen = number;
      }
    }
    return best;
  }

  bool isBetterDisplay(uint32_t a, uint32_t b) const {
    if (surfaces[a].isLowerCase != surfaces[b].isLowerCase) {
      return surfaces[a].isLowerCase;
    }
    if (surfaces[a].count != surfaces[b].count) {
      return surfaces[a].count > surfaces[b].count;
    }
    return surfaceNames[a] < surfaceNames[b];
  }

  std::vector<LUXWordSequence> formSequences() const {
    std::vector<LUXWordSequence> pages;
    pages.reserve(documents.size());
    for (const Document& document : documents) {
      LUXWordSequence page = document.sequence;
      for (LUXWordSequence::Word& word : page.words) {
        word.number = surfaces[word.number].form;
      }
      pages.push_back(std::move(page));
    }
    return pages;
  }

  // Forms that may begin or end a phrase: no stop words, and nothing without a letter.
  std::vector<bool> edgeForms() const {
    std::vector<bool> result(forms.count(), true);
    for (const Surface& surface : surfaces) {
      if (surface.form != none && surface.isStopWord) {
        result[surface.form] = false;
      }
    }
    for (size_t form = 0; form < forms.count(); ++form) {
      const std::string& text = forms[form];
      if (std::all_of(text.begin(), text.end(), [](char byte) {
            return (byte >= '0' && byte <= '9') || byte == '.' || byte == ',';
          })) {
        result[form] = false;
      }
    }
    return result;
  }

  platform::Data finish();
};

platform::Data LUXIndexWriter::Implementation::finish() {
  std::sort(documents.begin(), documents.end(),
            [](const Document& a, const Document& b) { return a.document.key < b.document.key; });
  LUXPhraseFinder finder;
  finder.find(formSequences(), edgeForms());

  std::unordered_map<uint64_t, uint32_t> bigramNumbers;
  std::vector<uint64_t> bigrams;
  std::array<std::vector<std::vector<Entry>>, LUXTokenKindCount> entries;
  for (auto& kind : entries) {
    kind.resize(documents.size());
  }
  for (size_t page = 0; page < documents.size(); ++page) {
    const LUXWordSequence& sequence = documents[page].sequence;
    uint32_t before = none;
    for (size_t at = 0; at < sequence.words.size(); ++at) {
      const LUXWordSequence::Word& word = sequence.words[at];
      const Surface& surface = surfaces[word.number];
      const bool inTitle = at < sequence.titleLength;
      entries[2][page].push_back({surface.form, inTitle});
      if (surface.isStopWord) {
        before = none;
        continue;
      }
      entries[0][page].push_back({surface.stem, inTitle});
      if (before != none && !word.breaksChain) {
        const uint64_t pair = static_cast<uint64_t>(before) << 32U | surface.stem;
        const auto [found, isNew] =
            bigramNumbers.emplace(pair, static_cast<uint32_t>(bigrams.size()));
        if (isNew) {
          bigrams.push_back(pair);
        }
        entries[1][page].push_back({found->second, inTitle});
      }
      before = surface.stem;
    }
  }

  // Names of the tokens of each kind, and their numbers in order.
  std::array<std::vector<std::string>, LUXTokenKindCount> names;
  std::vector<bool> stemIsKept(stems.count(), false);
  for (const Surface& surface : surfaces) {
    if (surface.stem != none && !surface.isStopWord) {
      stemIsKept[surface.stem] = true;
    }
  }
  for (size_t stem = 0; stem < stems.count(); ++stem) {
    names[0].push_back(stems[stem]);
  }
  for (const uint64_t pair : bigrams) {
    names[1].push_back(stems[pair >> 32U] + ' ' + stems[pair & 0xFFFFFFFFU]);
  }
  for (size_t form = 0; form < forms.count(); ++form) {
    names[2].push_back(forms[form]);
  }
  const std::vector<uint32_t> displays = displaySurfaces();
  for (const LUXPhrase& phrase : finder.phrases()) {
    std::string display;
    for (size_t i = 0; i < phrase.statistics.length; ++i) {
      HelpTokenizer::appendToDisplay(display, surfaceNames[displays[phrase.words[i]]]);
    }
    names[3].push_back(std::move(display));
  }

  std::array<Order, LUXTokenKindCount> orders;
  std::array<std::vector<std::string>, LUXTokenKindCount> sorted;
  uint32_t start = 0;
  for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
    orders[kind] = orderOf(names[kind], start);
    sorted[kind] = std::move(orders[kind].sorted);
    start += static_cast<uint32_t>(sorted[kind].size());
  }

  RecordsWriter counts;
  RecordsWriter keySection;
  RecordsWriter properties;
  for (size_t page = 0; page < documents.size(); ++page) {
    const LUXDocument& document = documents[page].document;
    keySection.beginRecord() += document.key;

    std::string& record = properties.beginRecord();
    appendVarnumber(record, (document.excludedFromSearch ? HelpLUXIndex::excludedFlag : 0) |
                                (document.description ? HelpLUXIndex::hasDescriptionFlag : 0));
    appendVarnumber(record, document.title.size());
    record += document.title;
    record += document.description.value_or(std::string());

    std::vector<LUXTokenCounts::Entry> all;
    for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
      for (const Entry& entry : entries[kind][page]) {
        all.push_back(
            {orders[kind].numberOf[entry.token], entry.inTitle ? 1U : 0U, entry.inTitle ? 0U : 1U});
      }
    }
    for (const LUXPhraseFinder::Count& count : finder.countsOfPages()[page]) {
      all.push_back({orders[3].numberOf[count.phrase], count.titleCount, count.bodyCount});
    }
    std::sort(all.begin(), all.end(),
              [](const auto& a, const auto& b) { return a.number < b.number; });
    std::string& bytes = counts.beginRecord();
    uint32_t next = 0;
    for (size_t i = 0; i < all.size();) {
      LUXTokenCounts::Entry sum = all[i];
      for (++i; i < all.size() && all[i].number == sum.number; ++i) {
        sum.titleCount += all[i].titleCount;
        sum.bodyCount += all[i].bodyCount;
      }
      const bool isPlain = sum.titleCount == 0 && sum.bodyCount == 1;
      appendVarnumber(bytes, static_cast<uint64_t>(sum.number - next) << 1U | (isPlain ? 0U : 1U));
      if (!isPlain) {
        appendVarnumber(bytes, sum.titleCount);
        appendVarnumber(bytes, sum.bodyCount);
      }
      next = sum.number + 1;
    }
  }

  platform::Value::Dictionary attributes;
  attributes.emplace(HelpLUXIndexAttributeLanguageKey, tokenizer->languageTag());
  attributes.emplace(HelpLUXIndexAttributeBigramThresholdKey,
                     thresholdOf(finder.phrases(), 2, documents.size()));
  attributes.emplace(HelpLUXIndexAttributeTrigramThresholdKey,
                     thresholdOf(finder.phrases(), 3, documents.size()));

  std::vector<LUXSection> sections;
  sections.push_back(LUXSection::sectionWithBytes(
      HelpLUXIndex::attributesSectionType,
      platform::dataFromPropertyList(std::move(attributes), platform::PropertyListFormat::binary)));
  sections.push_back(counts.section(HelpLUXIndex::countsSectionType));
  sections.push_back(keySection.section(HelpLUXIndex::keysSectionType));
  sections.push_back(properties.section(HelpLUXIndex::propertiesSectionType));
  sections.push_back(LUXSection::sectionWithBytes(
      HelpLUXIndex::tokensSectionType, LUXTokenTable::withTokens(sorted)->sectionBytes()));
  return LUXSectionedData(std::move(sections)).write();
}

LUXIndexWriter::LUXIndexWriter(std::shared_ptr<const HelpTokenizer> tokenizer)
    : _implementation(std::make_unique<Implementation>()) {
  _implementation->tokenizer = std::move(tokenizer);
}

LUXIndexWriter::~LUXIndexWriter() = default;

void LUXIndexWriter::addDocument(const LUXDocument& document) {
  if (!_implementation->keys.insert(document.key).second) {
    throw platform::Exception(platform::invalidArgumentException,
                              "the page " + document.key + " comes twice");
  }
  Document added;
  added.document = document;
  added.document.blocks.clear();
  _implementation->addText(document.title, added.sequence);
  added.sequence.titleLength = added.sequence.words.size();
  for (const std::string& block : document.blocks) {
    _implementation->addText(block, added.sequence);
  }
  _implementation->documents.push_back(std::move(added));
}

size_t LUXIndexWriter::documentCount() const noexcept { return _implementation->documents.size(); }

platform::Data LUXIndexWriter::finish() { return _implementation->finish(); }

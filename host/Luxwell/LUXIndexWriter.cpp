#include "host/Luxwell/LUXIndexWriter.h"

#include <algorithm>
#include <cstdint>
#include <functional>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXNumbers.h"
#include "host/Luxwell/LUXPhraseFinder.h"
#include "host/Luxwell/LUXSectionedData.h"
#include "host/Luxwell/LUXTokenSections.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"

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
    _numbers.emplace(std::string(name), number);
    _names.emplace_back(name);
    return number;
  }
  size_t count() const noexcept { return _names.size(); }
  const std::string& operator[](size_t number) const noexcept { return _names[number]; }
  const std::vector<std::string>& all() const noexcept { return _names; }

 private:
  std::unordered_map<std::string, uint32_t, TextHash, std::equal_to<>> _numbers;
  std::vector<std::string> _names;
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

// A name that is made of several words.
struct Whole {
  uint32_t form = 0;
  bool inTitle = false;
};

struct Page {
  std::string key;
  std::string title;
  std::optional<std::string> description;
  bool excludedFromSearch = false;
  // Numbers of surfaces.
  LUXWordSequence sequence;
  std::vector<Whole> wholes;
};

bool hasNoLetter(std::string_view form) {
  return std::all_of(form.begin(), form.end(), [](char byte) {
    return (byte >= '0' && byte <= '9') || byte == '.' || byte == ',';
  });
}

LUXSection section(uint32_t type, platform::Data bytes) {
  return LUXSection::sectionWithBytes(type, std::move(bytes));
}

}  // namespace

struct LUXIndexWriter::Implementation {
  std::shared_ptr<const HelpTokenizer> tokenizer;
  std::unordered_set<std::string> keys;
  std::vector<Page> pages;
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

  void addText(std::string_view text, bool isTitle, Page& page) {
    segments.clear();
    tokenizer->segmentsOfText(text, segments, buffer);
    bool breaks = true;
    for (const HelpTokenizer::Segment& segment : segments) {
      breaks = breaks || segment.breaksChain;
      const uint32_t number = surfaceNumber(segment.surface);
      if (surfaces[number].form == none) {
        continue;
      }
      if (!segment.whole.empty() && !breaks) {
        if (const std::string form = tokenizer->formOfSurface(segment.whole); !form.empty()) {
          page.wholes.push_back({forms.numberOf(form), isTitle});
        }
      }
      page.sequence.words.push_back({number, breaks});
      breaks = false;
    }
  }

  // Which surface each form is shown as: as it is written where it does not begin a sentence, as
  // far as one can know: in small letters if it ever is.
  std::vector<uint32_t> displaySurfaces() const {
    std::vector<uint32_t> best(forms.count(), none);
    for (uint32_t number = 0; number < surfaces.size(); ++number) {
      if (surfaces[number].form != none) {
        uint32_t& chosen = best[surfaces[number].form];
        chosen = chosen == none || isBetterDisplay(number, chosen) ? number : chosen;
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
    std::vector<LUXWordSequence> sequences;
    sequences.reserve(pages.size());
    for (const Page& page : pages) {
      sequences.push_back(page.sequence);
      for (LUXWordSequence::Word& word : sequences.back().words) {
        word.number = surfaces[word.number].form;
      }
    }
    return sequences;
  }

  // Forms that may begin or end a phrase: no stop words, and nothing without a letter.
  std::vector<bool> edgeForms() const {
    std::vector<bool> mayStand(forms.count());
    for (size_t form = 0; form < forms.count(); ++form) {
      mayStand[form] = !hasNoLetter(forms[form]);
    }
    for (const Surface& surface : surfaces) {
      if (surface.isStopWord) {
        mayStand[surface.form] = false;
      }
    }
    return mayStand;
  }

  void addWords(LUXTokenSections& tokens) const {
    std::unordered_map<uint64_t, uint32_t> bigrams;
    std::vector<std::string> bigramNames;
    for (size_t number = 0; number < pages.size(); ++number) {
      const Page& page = pages[number];
      uint32_t before = none;
      for (size_t at = 0; at < page.sequence.words.size(); ++at) {
        const LUXWordSequence::Word& word = page.sequence.words[at];
        const Surface& surface = surfaces[word.number];
        const uint32_t inTitle = at < page.sequence.titleLength ? 1 : 0;
        tokens.add(number, LUXTokenKind::form, surface.form, inTitle, 1 - inTitle);
        if (surface.isStopWord) {
          before = none;
          continue;
        }
        tokens.add(number, LUXTokenKind::stem, surface.stem, inTitle, 1 - inTitle);
        if (before != none && !word.breaksChain) {
          const uint64_t pair = static_cast<uint64_t>(before) << 32U | surface.stem;
          const auto [found, isNew] =
              bigrams.emplace(pair, static_cast<uint32_t>(bigramNames.size()));
          if (isNew) {
            bigramNames.push_back(stems[before] + ' ' + stems[surface.stem]);
          }
          tokens.add(number, LUXTokenKind::bigram, found->second, inTitle, 1 - inTitle);
        }
        before = surface.stem;
      }
      for (const Whole& whole : page.wholes) {
        const uint32_t inTitle = whole.inTitle ? 1 : 0;
        tokens.add(number, LUXTokenKind::form, whole.form, inTitle, 1 - inTitle);
      }
    }
    tokens.setNames(LUXTokenKind::stem, stems.all());
    tokens.setNames(LUXTokenKind::bigram, std::move(bigramNames));
    tokens.setNames(LUXTokenKind::form, forms.all());
  }

  void addTitles(LUXTokenSections& tokens) const {
    std::vector<std::string> names;
    for (size_t number = 0; number < pages.size(); ++number) {
      std::string title = tokenizer->tokenizedStringFromString(pages[number].title);
      if (!title.empty() && title.size() <= LUXTokenTable::maximumTokenLength) {
        tokens.add(number, LUXTokenKind::title, static_cast<uint32_t>(names.size()), 1, 0);
        names.push_back(std::move(title));
      }
    }
    tokens.setNames(LUXTokenKind::title, std::move(names));
  }

  void addPhrases(const LUXPhraseFinder& finder, LUXTokenSections& tokens) const {
    const std::vector<uint32_t> displays = displaySurfaces();
    std::vector<std::string> names;
    names.reserve(finder.phrases().size());
    for (const LUXPhrase& phrase : finder.phrases()) {
      std::string display;
      for (size_t i = 0; i < phrase.statistics.length; ++i) {
        HelpTokenizer::appendToDisplay(display, surfaceNames[displays[phrase.words[i]]]);
      }
      names.push_back(std::move(display));
    }
    for (size_t number = 0; number < pages.size(); ++number) {
      for (const LUXPhraseFinder::Count& count : finder.countsOfPages()[number]) {
        tokens.add(number, LUXTokenKind::phrase, count.phrase, count.titleCount, count.bodyCount);
      }
    }
    tokens.setNames(LUXTokenKind::phrase, std::move(names));
  }

  platform::Data attributes(const LUXPhraseFinder& finder) const {
    platform::Value::Dictionary attributes;
    attributes.emplace(HelpLUXIndexAttributeLanguageKey, tokenizer->languageTag());
    attributes.emplace(HelpLUXIndexAttributeTokenizerVersionKey, HelpTokenizer::version());
    attributes.emplace(HelpLUXIndexAttributeBigramThresholdKey,
                       LUXPhraseThreshold(finder.phrases(), 1, 2, pages.size()));
    attributes.emplace(HelpLUXIndexAttributeTrigramThresholdKey,
                       LUXPhraseThreshold(finder.phrases(), 3, 4, pages.size()));
    return platform::dataFromPropertyList(std::move(attributes),
                                          platform::PropertyListFormat::binary);
  }

  LUXRecordsWriter keyRecords() const {
    LUXRecordsWriter records;
    for (const Page& page : pages) {
      records.beginRecord() += page.key;
    }
    return records;
  }

  LUXRecordsWriter propertyRecords() const {
    LUXRecordsWriter records;
    for (const Page& page : pages) {
      std::string& record = records.beginRecord();
      appendVarnumber(record, (page.excludedFromSearch ? HelpLUXIndex::excludedFlag : 0) |
                                  (page.description ? HelpLUXIndex::hasDescriptionFlag : 0));
      appendVarnumber(record, page.title.size());
      record += page.title;
      record += page.description.value_or(std::string());
    }
    return records;
  }

  platform::Data finish() {
    std::sort(pages.begin(), pages.end(),
              [](const Page& a, const Page& b) { return a.key < b.key; });
    LUXPhraseFinder finder;
    finder.find(formSequences(), edgeForms());
    LUXTokenSections tokens(pages.size());
    addWords(tokens);
    addTitles(tokens);
    addPhrases(finder, tokens);
    tokens.finish();
    return LUXSectionedData(
               {section(HelpLUXIndex::attributesSectionType, attributes(finder)),
                section(HelpLUXIndex::countsSectionType, tokens.countRecords().finish()),
                section(HelpLUXIndex::keysSectionType, keyRecords().finish()),
                section(HelpLUXIndex::propertiesSectionType, propertyRecords().finish()),
                section(HelpLUXIndex::tokensSectionType, tokens.tokenBytes())})
        .write();
  }
};

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
  Page page{
      document.key, document.title, document.description, document.excludedFromSearch, {}, {}};
  _implementation->addText(document.title, true, page);
  page.sequence.titleLength = page.sequence.words.size();
  for (const std::string& block : document.blocks) {
    _implementation->addText(block, false, page);
  }
  _implementation->pages.push_back(std::move(page));
}

size_t LUXIndexWriter::documentCount() const noexcept { return _implementation->pages.size(); }

platform::Data LUXIndexWriter::finish() { return _implementation->finish(); }

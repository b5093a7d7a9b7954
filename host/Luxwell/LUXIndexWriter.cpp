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
#include "host/Luxwell/LUXPairTable.h"
#include "host/Luxwell/LUXParallel.h"
#include "host/Luxwell/LUXPhraseFinder.h"
#include "host/Luxwell/LUXSectionedData.h"
#include "host/Luxwell/LUXTokenSections.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"

using luxnumbers::appendVarnumber;

namespace {

constexpr uint32_t none = 0xFFFFFFFF;

// A piece of work while the data are written.
constexpr size_t pagesAtOnce = 64;

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
  // None for stop words.
  uint32_t stem = none;
  bool isLowerCase = false;
  uint32_t count = 0;
};

// A name that is made of several words.
struct Whole {
  uint32_t form = 0;
  // Of its last word in the page.
  size_t place = 0;
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
  // By their stems.
  LUXPairTable bigrams;
  size_t threadCount = 1;
  std::vector<HelpTokenizer::Segment> segments;
  std::string buffer;

  uint32_t surfaceNumber(std::string_view text) {
    const uint32_t number = surfaceNames.numberOf(text);
    if (number == surfaces.size()) {
      Surface surface;
      if (const auto word = tokenizer->wordOfSurface(text)) {
        surface.form = forms.numberOf(word->form);
        surface.stem = word->isStopWord ? none : stems.numberOf(word->stem);
        surface.isLowerCase = platform::lowercaseString(text) == text;
      }
      surfaces.push_back(surface);
    }
    ++surfaces[number].count;
    return number;
  }

  void addText(std::string_view text, Page& page) {
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
          page.wholes.push_back({forms.numberOf(form), page.sequence.words.size()});
        }
      }
      page.sequence.words.push_back({number, breaks});
      breaks = false;
    }
  }

  // The numbers of `other` mean the same words under other numbers here.
  void absorb(Implementation& other) {
    std::vector<uint32_t> surfaceOfOther(other.surfaces.size());
    for (size_t theirs = 0; theirs < other.surfaces.size(); ++theirs) {
      const Surface& surface = other.surfaces[theirs];
      const uint32_t ours = surfaceNames.numberOf(other.surfaceNames[theirs]);
      if (ours == surfaces.size()) {
        surfaces.push_back(surface);
        Surface& added = surfaces.back();
        added.count = 0;
        added.form = surface.form == none ? none : forms.numberOf(other.forms[surface.form]);
        added.stem = surface.stem == none ? none : stems.numberOf(other.stems[surface.stem]);
      }
      surfaces[ours].count += surface.count;
      surfaceOfOther[theirs] = ours;
    }
    for (Page& page : other.pages) {
      for (LUXWordSequence::Word& word : page.sequence.words) {
        word.number = surfaceOfOther[word.number];
      }
      for (Whole& whole : page.wholes) {
        whole.form = forms.numberOf(other.forms[whole.form]);
      }
      pages.push_back(std::move(page));
    }
    keys.merge(other.keys);
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

  // Forms that may begin or end a phrase: no stop words, and nothing without a letter.
  std::vector<bool> edgeForms() const {
    std::vector<bool> mayStand(forms.count());
    for (size_t form = 0; form < forms.count(); ++form) {
      mayStand[form] = !hasNoLetter(forms[form]);
    }
    for (const Surface& surface : surfaces) {
      if (surface.form != none && surface.stem == none) {
        mayStand[surface.form] = false;
      }
    }
    return mayStand;
  }

  LUXPhraseFinder phrases() const {
    std::vector<const LUXWordSequence*> sequences;
    sequences.reserve(pages.size());
    for (const Page& page : pages) {
      sequences.push_back(&page.sequence);
    }
    std::vector<uint32_t> formOfSurface;
    formOfSurface.reserve(surfaces.size());
    for (const Surface& surface : surfaces) {
      formOfSurface.push_back(surface.form);
    }
    LUXPhraseFinder finder;
    finder.find(sequences, formOfSurface, edgeForms(), threadCount);
    return finder;
  }

  // Calls the sink with the stems of each pair that makes a bigram, and the place of the second.
  template <typename Sink>
  void forEachBigram(const Page& page, Sink sink) const {
    uint32_t before = none;
    for (size_t at = 0; at < page.sequence.words.size(); ++at) {
      const LUXWordSequence::Word& word = page.sequence.words[at];
      const uint32_t stem = surfaces[word.number].stem;
      if (before != none && stem != none && !word.breaksChain) {
        sink(before, stem, at);
      }
      before = stem;
    }
  }

  // Numbers the bigrams, and returns their names.
  std::vector<std::string> numberBigrams() {
    std::vector<std::string> names;
    for (const Page& page : pages) {
      forEachBigram(page, [&](uint32_t first, uint32_t second, size_t) {
        if (bigrams.numberOf(first, second).second) {
          names.push_back(stems[first] + ' ' + stems[second]);
        }
      });
    }
    return names;
  }

  std::vector<std::string> phraseNames(const LUXPhraseFinder& finder) const {
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
    return names;
  }

  // By the position of the page; empty where the title is too long for a token or has no words.
  std::vector<std::string> titleNames() const {
    std::vector<std::string> names;
    names.reserve(pages.size());
    for (const Page& page : pages) {
      names.push_back(tokenizer->tokenizedStringFromString(page.title));
      if (names.back().size() > LUXTokenTable::maximumTokenLength) {
        names.back().clear();
      }
    }
    return names;
  }

  LUXTokenSections tokens(const LUXPhraseFinder& finder) {
    std::vector<std::string> titles = titleNames();
    // The titles that are tokens, and which of them is each page's.
    std::vector<std::string> kept;
    std::vector<uint32_t> titleOfPage(pages.size(), none);
    for (size_t number = 0; number < pages.size(); ++number) {
      if (!titles[number].empty()) {
        titleOfPage[number] = static_cast<uint32_t>(kept.size());
        kept.push_back(std::move(titles[number]));
      }
    }
    LUXTokenSections sections(
        {stems.all(), numberBigrams(), forms.all(), phraseNames(finder), std::move(kept)});
    // Each piece's pages are one part, so that they can be put in order.
    std::vector<std::unique_ptr<LUXTokenSections::Pages>> parts((pages.size() + pagesAtOnce - 1) /
                                                                pagesAtOnce);
    LUXInParallel(pages.size(), pagesAtOnce, threadCount, [&](size_t from, size_t to) {
      auto part = std::make_unique<LUXTokenSections::Pages>(sections);
      for (size_t number = from; number < to; ++number) {
        addWords(pages[number], *part);
        for (const LUXPhraseFinder::Count& count : finder.countsOfPages()[number]) {
          part->add(LUXTokenKind::phrase, count.phrase, count.titleCount, count.bodyCount);
        }
        if (titleOfPage[number] != none) {
          part->add(LUXTokenKind::title, titleOfPage[number], 1, 0);
        }
        part->endPage();
      }
      parts[from / pagesAtOnce] = std::move(part);
    });
    for (auto& part : parts) {
      sections.append(*part);
      part.reset();
    }
    return sections;
  }

  void addWords(const Page& page, LUXTokenSections::Pages& sections) const {
    const size_t titleLength = page.sequence.titleLength;
    const auto add = [&](LUXTokenKind kind, uint32_t token, size_t at) {
      if (at < titleLength) {
        sections.add(kind, token, 1, 0, 0);
      } else {
        const size_t before = std::min<size_t>(at - titleLength, LUXTokenCount::farDown);
        sections.add(kind, token, 0, 1, static_cast<uint8_t>(before));
      }
    };
    for (size_t at = 0; at < page.sequence.words.size(); ++at) {
      const Surface& surface = surfaces[page.sequence.words[at].number];
      add(LUXTokenKind::form, surface.form, at);
      if (surface.stem != none) {
        add(LUXTokenKind::stem, surface.stem, at);
      }
    }
    forEachBigram(page, [&](uint32_t first, uint32_t second, size_t at) {
      add(LUXTokenKind::bigram, bigrams.at(first, second), at);
    });
    for (const Whole& whole : page.wholes) {
      add(LUXTokenKind::form, whole.form, whole.place);
    }
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
    const LUXPhraseFinder finder = phrases();
    LUXTokenSections sections = tokens(finder);
    return LUXSectionedData(
               {section(HelpLUXIndex::attributesSectionType, attributes(finder)),
                section(HelpLUXIndex::countsSectionType, sections.countBytes()),
                section(HelpLUXIndex::keysSectionType, keyRecords().finish()),
                section(HelpLUXIndex::propertiesSectionType, propertyRecords().finish()),
                section(HelpLUXIndex::tokensSectionType, sections.tokenBytes()),
                section(HelpLUXIndex::placesSectionType, sections.placeBytes())})
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
  _implementation->addText(document.title, page);
  page.sequence.titleLength = page.sequence.words.size();
  for (const std::string& block : document.blocks) {
    _implementation->addText(block, page);
  }
  _implementation->pages.push_back(std::move(page));
}

void LUXIndexWriter::absorb(LUXIndexWriter& other) {
  for (const std::string& key : other._implementation->keys) {
    if (_implementation->keys.contains(key)) {
      throw platform::Exception(platform::invalidArgumentException,
                                "the page " + key + " comes twice");
    }
  }
  _implementation->absorb(*other._implementation);
  other._implementation.reset();
}

size_t LUXIndexWriter::documentCount() const noexcept { return _implementation->pages.size(); }

platform::Data LUXIndexWriter::finish(size_t threadCount) {
  _implementation->threadCount = threadCount;
  return _implementation->finish();
}

#include "host/Luxwell/LUXIndexWriter.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <functional>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXBigrams.h"
#include "host/Luxwell/LUXNumbering.h"
#include "host/Luxwell/LUXNumbers.h"
#include "host/Luxwell/LUXParallel.h"
#include "host/Luxwell/LUXPhraseFinder.h"
#include "host/Luxwell/LUXSectionedData.h"
#include "host/Luxwell/LUXTextOrder.h"
#include "host/Luxwell/LUXTokenSectionWriter.h"
#include "host/Luxwell/LUXTokenSections.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"

using luxnumbers::appendVarnumber;

namespace {

constexpr uint32_t none = 0xFFFFFFFF;

// A piece of work while the data are written.
constexpr size_t pagesAtOnce = 64;

constexpr size_t wordsAhead = 8;

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
  uint32_t place = 0;
};

// Texts one after the other, by number.
class Texts {
 public:
  void add(std::string_view text) {
    _text += text;
    _ends.push_back(_text.size());
  }
  size_t size() const noexcept { return _ends.size(); }
  std::string_view operator[](size_t number) const noexcept {
    const size_t from = number == 0 ? 0 : _ends[number - 1];
    return std::string_view(_text).substr(from, _ends[number] - from);
  }

 private:
  std::string _text;
  std::vector<size_t> _ends;
};

// What texts come to as tokens of one kind, of which there is one for each different text.
struct Ranking {
  // Texts that are different, in order.
  std::vector<uint32_t> order;
  // By the number of a text.
  std::vector<uint32_t> rank;
};

template <typename AllTexts>
Ranking rankingOf(const AllTexts& texts) {
  Ranking ranking;
  ranking.rank.resize(texts.size());
  for (const uint32_t number :
       LUXOrderOfTexts(texts.size(), [&](uint32_t i) { return texts[i]; })) {
    if (ranking.order.empty() || texts[ranking.order.back()] != texts[number]) {
      ranking.order.push_back(number);
    }
    ranking.rank[number] = static_cast<uint32_t>(ranking.order.size() - 1);
  }
  return ranking;
}

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
  LUXStringNumbering surfaceNames;
  std::vector<Surface> surfaces;
  LUXStringNumbering forms;
  LUXStringNumbering stems;
  size_t threadCount = 1;
  // Of the page that is being added.
  std::vector<LUXWordSequence::Word> words;
  std::vector<HelpTokenizer::Segment> segments;
  std::string buffer;

  uint32_t surfaceNumber(std::string_view text, const LUXStringNumbering::Key& key) {
    const uint32_t number = surfaceNames.numberOf(text, key);
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
    // The words after the one that is looked up are on their way meanwhile.
    std::array<LUXStringNumbering::Key, wordsAhead> ahead;
    const auto prepare = [&](size_t i) {
      if (i < segments.size()) {
        ahead[i % wordsAhead] = LUXStringNumbering::keyOf(segments[i].surface);
        surfaceNames.prefetch(ahead[i % wordsAhead]);
      }
    };
    for (size_t i = 0; i < wordsAhead; ++i) {
      prepare(i);
    }
    bool breaks = true;
    for (size_t i = 0; i < segments.size(); ++i) {
      const HelpTokenizer::Segment& segment = segments[i];
      breaks = breaks || segment.breaksChain;
      const uint32_t number = surfaceNumber(segment.surface, ahead[i % wordsAhead]);
      prepare(i + wordsAhead);
      if (surfaces[number].form == none) {
        continue;
      }
      if (!segment.whole.empty() && !breaks) {
        if (const std::string form = tokenizer->formOfSurface(segment.whole); !form.empty()) {
          page.wholes.push_back({forms.numberOf(form), static_cast<uint32_t>(words.size())});
        }
      }
      words.emplace_back(number, breaks);
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
        word = {surfaceOfOther[word.number()], word.breaksChain()};
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
    std::vector<uint32_t> best(forms.size(), none);
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
    std::vector<bool> mayStand(forms.size());
    for (size_t form = 0; form < forms.size(); ++form) {
      mayStand[form] = !hasNoLetter(forms[form]);
    }
    for (const Surface& surface : surfaces) {
      if (surface.form != none && surface.stem == none) {
        mayStand[surface.form] = false;
      }
    }
    return mayStand;
  }

  std::vector<const LUXWordSequence*> sequences() const {
    std::vector<const LUXWordSequence*> all;
    all.reserve(pages.size());
    for (const Page& page : pages) {
      all.push_back(&page.sequence);
    }
    return all;
  }

  std::vector<uint32_t> formsOfSurfaces() const {
    std::vector<uint32_t> all;
    all.reserve(surfaces.size());
    for (const Surface& surface : surfaces) {
      all.push_back(surface.form);
    }
    return all;
  }

  Texts phraseNames(const LUXPhraseFinder& finder) const {
    const std::vector<uint32_t> displays = displaySurfaces();
    Texts names;
    std::string display;
    for (const LUXPhrase& phrase : finder.phrases()) {
      display.clear();
      for (size_t i = 0; i < phrase.statistics.length; ++i) {
        HelpTokenizer::appendToDisplay(display, surfaceNames[displays[phrase.words[i]]]);
      }
      names.add(display);
    }
    return names;
  }

  // The titles that are tokens, and which of them is each page's. None where the title is too long
  // for a token or has no words.
  Texts titleNames(std::vector<uint32_t>& titleOfPage) const {
    Texts names;
    for (const Page& page : pages) {
      const std::string name = tokenizer->tokenizedStringFromString(page.title);
      const bool isToken = !name.empty() && name.size() <= LUXTokenTable::maximumTokenLength;
      titleOfPage.push_back(isToken ? static_cast<uint32_t>(names.size()) : none);
      if (isToken) {
        names.add(name);
      }
    }
    return names;
  }

  // What the tokens of the book are.
  struct TokenData {
    Ranking stems;
    Ranking forms;
    Ranking phrases;
    Ranking titles;
    Texts phraseNames;
    Texts titleNames;
    std::vector<uint32_t> titleOfPage;
    LUXBigrams bigrams;
    // By surface, the rank of its stem.
    std::vector<uint32_t> stemOfSurface;
    // Where the numbers of each kind begin; and end.
    std::array<uint32_t, LUXTokenKindCount + 1> starts{};

    // What only the tokens themselves are made of.
    void forgetTexts() {
      phraseNames = {};
      titleNames = {};
      for (Ranking* const ranking : {&stems, &forms, &phrases, &titles}) {
        std::vector<uint32_t>().swap(ranking->order);
      }
      bigrams.forgetPairs();
    }

    uint32_t startOf(LUXTokenKind kind) const { return starts[static_cast<size_t>(kind)]; }
  };

  platform::Data tokenSection(const TokenData& data) const {
    LUXTokenSectionWriter writer;
    const auto addAll = [&](LUXTokenKind kind, const auto& texts, const Ranking& ranking) {
      for (const uint32_t number : ranking.order) {
        writer.add(kind, texts[number]);
      }
    };
    addAll(LUXTokenKind::stem, stems, data.stems);
    // A stem has no blank in it, and nothing that comes before one: the order of the stems is that
    // of the pairs.
    std::string name;
    uint32_t before = none;
    size_t beginning = 0;
    data.bigrams.forEach([&](uint32_t first, uint32_t second) {
      if (first != before) {
        name = stems[data.stems.order[first]];
        name += ' ';
        beginning = name.size();
        before = first;
      }
      name.resize(beginning);
      name += stems[data.stems.order[second]];
      writer.add(LUXTokenKind::bigram, name);
    });
    addAll(LUXTokenKind::form, forms, data.forms);
    addAll(LUXTokenKind::phrase, data.phraseNames, data.phrases);
    addAll(LUXTokenKind::title, data.titleNames, data.titles);
    return writer.finish();
  }

  void findTokens(LUXPhraseFinder& finder, TokenData& data) const {
    const std::array<std::function<void()>, 4> rankings = {
        [&] {
          data.phraseNames = phraseNames(finder);
          finder.forgetPhrases();
          data.phrases = rankingOf(data.phraseNames);
        },
        [&] { data.stems = rankingOf(stems); }, [&] { data.forms = rankingOf(forms); },
        [&] {
          data.titleNames = titleNames(data.titleOfPage);
          data.titles = rankingOf(data.titleNames);
        }};
    LUXInParallel(rankings.size(), 1, threadCount, [&](size_t i, size_t) { rankings[i](); });
    data.stemOfSurface.reserve(surfaces.size());
    for (const Surface& surface : surfaces) {
      data.stemOfSurface.push_back(surface.stem == none ? none : data.stems.rank[surface.stem]);
    }
    data.bigrams.find(sequences(), data.stemOfSurface, stems.size(), threadCount);
    uint64_t start = 0;
    const std::array<size_t, LUXTokenKindCount> counts = {
        data.stems.order.size(), data.bigrams.size(), data.forms.order.size(),
        data.phrases.order.size(), data.titles.order.size()};
    for (size_t kind = 0; kind < counts.size(); ++kind) {
      start += counts[kind];
      data.starts[kind + 1] = static_cast<uint32_t>(start);
    }
    if (start >= none) {
      throw platform::Exception(platform::invalidArgumentException,
                                "a book too large for semantic data");
    }
  }

  LUXTokenSections pageSections(LUXPhraseFinder& finder, const TokenData& data) {
    const std::vector<uint32_t> formOfSurface = formsOfSurfaces();
    // Each piece's pages are one part, so that they can be put in order.
    std::vector<std::unique_ptr<LUXTokenSections>> parts((pages.size() + pagesAtOnce - 1) /
                                                         pagesAtOnce);
    const auto newPart = [&] {
      return std::make_unique<LUXTokenSections>(data.starts.back(),
                                                data.startOf(LUXTokenKind::phrase));
    };
    LUXInParallel(pages.size(), pagesAtOnce, threadCount, [&](size_t from, size_t to) {
      auto part = newPart();
      for (size_t number = from; number < to; ++number) {
        addWords(number, data, *part);
        finder.forEachPhraseOfPage(
            number, pages[number].sequence, formOfSurface, [&](uint32_t phrase, bool inTitle) {
              const uint32_t token = data.startOf(LUXTokenKind::phrase) + data.phrases.rank[phrase];
              inTitle ? part->addInTitle(token) : part->addInBody(token);
            });
        if (data.titleOfPage[number] != none) {
          part->addInTitle(data.startOf(LUXTokenKind::title) +
                           data.titles.rank[data.titleOfPage[number]]);
        }
        part->endPage();
        // What is written takes the place of what it was made from.
        std::vector<LUXWordSequence::Word>().swap(pages[number].sequence.words);
        finder.forgetPage(number);
      }
      parts[from / pagesAtOnce] = std::move(part);
    });
    LUXTokenSections sections(data.starts.back(), data.startOf(LUXTokenKind::phrase));
    sections.append(std::move(parts));
    return sections;
  }

  void addWords(size_t number, const TokenData& data, LUXTokenSections& sections) const {
    const Page& page = pages[number];
    const size_t titleLength = page.sequence.titleLength;
    const auto add = [&](uint32_t token, size_t at) {
      if (at < titleLength) {
        sections.addInTitle(token);
      } else {
        sections.addInBody(token, static_cast<uint8_t>(
                                      std::min<size_t>(at - titleLength, LUXTokenCount::farDown)));
      }
    };
    for (size_t at = 0; at < page.sequence.words.size(); ++at) {
      const uint32_t stem = data.stemOfSurface[page.sequence.words[at].number()];
      if (stem != none) {
        add(stem, at);
      }
    }
    sections.endKind();
    const uint32_t bigramStart = data.startOf(LUXTokenKind::bigram);
    data.bigrams.forEachOfPage(number, page.sequence, data.stemOfSurface,
                               [&](uint32_t bigram, size_t at) { add(bigramStart + bigram, at); });
    sections.endKind();
    const uint32_t formStart = data.startOf(LUXTokenKind::form);
    for (size_t at = 0; at < page.sequence.words.size(); ++at) {
      add(formStart + data.forms.rank[surfaces[page.sequence.words[at].number()].form], at);
    }
    for (const Whole& whole : page.wholes) {
      add(formStart + data.forms.rank[whole.form], whole.place);
    }
    sections.endKind();
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
    platform::Data attributeBytes;
    platform::Data tokenBytes;
    std::optional<LUXTokenSections> sections;
    {
      LUXPhraseFinder finder;
      finder.find(sequences(), formsOfSurfaces(), edgeForms(), threadCount);
      attributeBytes = attributes(finder);
      TokenData data;
      findTokens(finder, data);
      tokenBytes = tokenSection(data);
      data.forgetTexts();
      sections.emplace(pageSections(finder, data));
    }
    return LUXSectionedData(
               {section(HelpLUXIndex::attributesSectionType, std::move(attributeBytes)),
                section(HelpLUXIndex::countsSectionType, sections->countBytes()),
                section(HelpLUXIndex::keysSectionType, keyRecords().finish()),
                section(HelpLUXIndex::propertiesSectionType, propertyRecords().finish()),
                section(HelpLUXIndex::tokensSectionType, std::move(tokenBytes)),
                section(HelpLUXIndex::placesSectionType, sections->placeBytes())})
        .write();
  }
};

LUXIndexWriter::LUXIndexWriter(std::shared_ptr<const HelpTokenizer> tokenizer)
    : _implementation(std::make_unique<Implementation>()) {
  _implementation->tokenizer = std::move(tokenizer);
}

LUXIndexWriter::~LUXIndexWriter() = default;

void LUXIndexWriter::addDocument(const LUXDocument& document) {
  addDocument(LUXDocumentView{document.key,
                              document.title,
                              document.description,
                              document.excludedFromSearch,
                              {document.blocks.begin(), document.blocks.end()}});
}

void LUXIndexWriter::addDocument(const LUXDocumentView& document) {
  Page page{std::string(document.key),
            std::string(document.title),
            std::optional<std::string>(document.description),
            document.excludedFromSearch,
            {},
            {}};
  if (!_implementation->keys.insert(page.key).second) {
    throw platform::Exception(platform::invalidArgumentException,
                              "the page " + page.key + " comes twice");
  }
  std::vector<LUXWordSequence::Word>& words = _implementation->words;
  words.clear();
  _implementation->addText(document.title, page);
  page.sequence.titleLength = words.size();
  for (const std::string_view block : document.blocks) {
    _implementation->addText(block, page);
  }
  page.sequence.words.assign(words.begin(), words.end());
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

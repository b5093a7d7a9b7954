#include "host/Luxwell/LUXIndexWriter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <random>
#include <string>
#include <thread>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXRecords.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"

using platform::Data;
using platform::Value;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;

namespace {

LUXDocument document(std::string key, std::string title, std::vector<std::string> blocks) {
  LUXDocument result;
  result.key = std::move(key);
  result.title = std::move(title);
  result.blocks = std::move(blocks);
  return result;
}

Data written(const std::vector<LUXDocument>& documents, std::string_view language = "English") {
  LUXIndexWriter writer(HelpTokenizer::tokenizerForLanguage(language));
  for (const LUXDocument& added : documents) {
    writer.addDocument(added);
  }
  EXPECT_EQ(writer.documentCount(), documents.size());
  return writer.finish();
}

std::shared_ptr<HelpLUXIndex> index(const std::vector<LUXDocument>& documents,
                                    std::string_view language = "English") {
  auto result = HelpLUXIndex::initWithVersionedData(written(documents, language));
  EXPECT_NE(result, nullptr);
  return result;
}

// Counts in the title and elsewhere by kind and token.
using Counts = std::map<std::pair<LUXTokenKind, std::string>, std::pair<uint32_t, uint32_t>>;

Counts countsOf(const HelpLUXIndex& opened, std::string_view key) {
  const LUXTokenCounts counts = opened.tokenCountsForKey(key);
  Counts result;
  for (size_t i = 0; i < counts.size(); ++i) {
    const LUXTokenCount count = counts[i];
    EXPECT_TRUE(result
                    .emplace(std::pair(count.kind, std::string(count.token)),
                             std::pair(count.titleCount, count.bodyCount))
                    .second);
    EXPECT_EQ(counts.table()->tokenAt(counts.tokenNumber(i)).token, count.token);
  }
  return result;
}

std::vector<std::string> tokensOf(const HelpLUXIndex& opened, std::string_view key,
                                  LUXTokenKind kind) {
  std::vector<std::string> result;
  for (const auto& entry : countsOf(opened, key)) {
    if (entry.first.first == kind) {
      result.push_back(entry.first.second);
    }
  }
  return result;
}

// Everything but phrases, counted one word after the other.
Counts countedByForce(const LUXDocument& page) {
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage("English");
  Counts counts;
  const auto add = [&](LUXTokenKind kind, const std::string& token, bool isTitle) {
    auto& count = counts[std::pair(kind, token)];
    ++(isTitle ? count.first : count.second);
  };
  const auto addText = [&](const std::string& text, bool isTitle) {
    std::vector<HelpTokenizer::Word> words;
    tokenizer->wordsOfText(text, words);
    for (size_t i = 0; i < words.size(); ++i) {
      add(LUXTokenKind::form, words[i].form, isTitle);
      if (!words[i].wholeForm.empty()) {
        add(LUXTokenKind::form, words[i].wholeForm, isTitle);
      }
      if (words[i].isStopWord) {
        continue;
      }
      add(LUXTokenKind::stem, words[i].stem, isTitle);
      if (i > 0 && !words[i].breaksChain && !words[i - 1].isStopWord) {
        add(LUXTokenKind::bigram, words[i - 1].stem + " " + words[i].stem, isTitle);
      }
    }
  };
  addText(page.title, true);
  for (const std::string& block : page.blocks) {
    addText(block, false);
  }
  const std::string title = tokenizer->tokenizedStringFromString(page.title);
  if (!title.empty()) {
    add(LUXTokenKind::title, title, true);
  }
  return counts;
}

std::vector<LUXDocument> example() {
  LUXDocument described = document("b.html", "Print Queues", {"Jobs wait in the print queue."});
  described.description = "All about queues.";
  LUXDocument hidden = document("sub/c.html", "Hidden", {"A print queue, hidden."});
  hidden.excludedFromSearch = true;
  return {document("a.html", "Printing", {"The print queue.", "A print queue"}), described, hidden};
}

}  // namespace

TEST(LUXIndexWriter, absorbedWritersMakeTheSameBytesAsOne) {
  std::mt19937 random(3);
  std::vector<LUXDocument> documents;
  for (int i = 0; i < 200; ++i) {
    std::string text;
    for (int word = 0; word < 50; ++word) {
      const uint32_t number = static_cast<uint32_t>(random());
      text += (number % 3 == 0 ? "Word" : "word") + std::to_string(number / 3 % 90);
      text += number % 11 == 0 ? ". The " : number % 7 == 0 ? " os.path " : " ";
    }
    documents.push_back(document("page" + std::to_string(i * 37 % 200),
                                 "Title " + text.substr(0, 9), {text, "The print queue waits."}));
  }
  const Data bytes = written(documents);
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage("English");
  for (const size_t count : {1U, 2U, 3U, 70U}) {
    std::vector<std::unique_ptr<LUXIndexWriter>> writers;
    for (size_t i = 0; i < count; ++i) {
      writers.push_back(std::make_unique<LUXIndexWriter>(tokenizer));
    }
    for (const LUXDocument& added : documents) {
      writers[random() % count]->addDocument(added);
    }
    for (size_t i = 1; i < count; ++i) {
      writers[0]->absorb(*writers[i]);
    }
    EXPECT_EQ(writers[0]->documentCount(), documents.size());
    // Threads that take part in writing change nothing either.
    EXPECT_EQ(writers[0]->finish(count), bytes);
  }
}

TEST(LUXIndexWriter, refusesToAbsorbAKeyThatIsThereAlready) {
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage("English");
  LUXIndexWriter writer(tokenizer);
  LUXIndexWriter other(tokenizer);
  writer.addDocument(document("a", "One", {"one"}));
  other.addDocument(document("a", "Two", {"two"}));
  EXPECT_THROW(writer.absorb(other), platform::Exception);
  EXPECT_EQ(writer.documentCount(), 1U);
  EXPECT_EQ(other.documentCount(), 1U);
}

TEST(LUXIndexWriter, KeysStandInTheOrderOfTheirBytes) {
  const auto opened = index({document("b", "B", {}), document("a/z", "Z", {}),
                             document("a.html", "A", {}), document("\u00E4", "U", {})});
  EXPECT_THAT(opened->documentKeys(), ElementsAre("a.html", "a/z", "b", "\u00E4"));
  EXPECT_EQ(opened->keyEnumerator(), opened->documentKeys());
}

TEST(LUXIndexWriter, SameBytesInWhateverOrderPagesAreAdded) {
  std::vector<LUXDocument> pages = example();
  const Data bytes = written(pages);
  EXPECT_EQ(written(pages), bytes);
  std::reverse(pages.begin(), pages.end());
  EXPECT_EQ(written(pages), bytes);
}

TEST(LUXIndexWriter, RefusesAKeyThatComesTwice) {
  LUXIndexWriter writer(HelpTokenizer::tokenizerForLanguage("English"));
  writer.addDocument(document("a", "A", {}));
  EXPECT_THROW(writer.addDocument(document("a", "B", {})), platform::Exception);
}

TEST(LUXIndexWriter, PropertiesAreKept) {
  const auto opened = index(example());
  EXPECT_EQ(opened->fileProperitesForKey("a.html"),
            Value(Value::Dictionary{{"HelpDocPropertyTitle", "Printing"}}));
  EXPECT_EQ(opened->fileProperitesForKey("b.html"),
            Value(Value::Dictionary{{"HelpDocPropertyTitle", "Print Queues"},
                                    {"HelpDocPropertyDescription", "All about queues."}}));
  EXPECT_EQ(opened->fileProperitesForKey("sub/c.html"),
            Value(Value::Dictionary{{"HelpDocPropertyTitle", "Hidden"},
                                    {"HelpDocPropertyExcludeFromSearch", true}}));
  EXPECT_TRUE(opened->fileProperitesForKey("/a.html").isAbsent());
  EXPECT_TRUE(opened->fileProperitesForKey("").isAbsent());
}

TEST(LUXIndexWriter, ShownDescriptionsAreNotCounted) {
  EXPECT_THAT(tokensOf(*index(example()), "b.html", LUXTokenKind::form), Not(Contains("about")));
}

TEST(LUXIndexWriter, CountsAreThoseOfBruteForce) {
  const std::vector<std::string> vocabulary = {
      "print",  "Printing", "queue", "queues", "the", "of",  "user's", "os.path", "3.14", ",",
      "Writer", "file_a",   "can't", ".",      "not", "été", "ÉTÉ",    "x",       "-",    "print"};
  std::mt19937 random(3);
  const auto text = [&](size_t length) {
    std::string result;
    for (size_t i = 0; i < length; ++i) {
      result += vocabulary[random() % vocabulary.size()] + " ";
    }
    return result;
  };
  std::vector<LUXDocument> pages;
  pages.reserve(40);
  for (int i = 0; i < 40; ++i) {
    pages.push_back(document(std::to_string(i), text(random() % 5),
                             {text(random() % 30), text(random() % 30)}));
  }
  const auto opened = index(pages);
  for (const LUXDocument& page : pages) {
    Counts counts = countsOf(*opened, page.key);
    std::erase_if(counts,
                  [](const auto& entry) { return entry.first.first == LUXTokenKind::phrase; });
    EXPECT_EQ(counts, countedByForce(page)) << page.key;
  }
}

// By kind and token.
using Places = std::map<std::pair<LUXTokenKind, std::string>, uint8_t>;

Places placesOf(const HelpLUXIndex& opened, std::string_view key) {
  const LUXTokenCounts counts = opened.tokenCountsForKey(key);
  Places places;
  for (size_t i = 0; i < counts.size(); ++i) {
    places[std::pair(counts[i].kind, std::string(counts[i].token))] = counts[i].wordsBefore;
  }
  return places;
}

TEST(LUXIndexWriter, TokensKnowHowManyWordsComeBeforeThem) {
  const auto opened = index({document(
      "a", "Print queues", {"The jobs of os.path wait.", "Jobs wait in the queue, wait."})});
  const Places places = placesOf(*opened, "a");
  const auto place = [&](LUXTokenKind kind, const char* token) {
    return static_cast<int>(places.at(std::pair(kind, std::string(token))));
  };
  using enum LUXTokenKind;
  EXPECT_EQ(place(form, "the"), 0);
  EXPECT_EQ(place(form, "jobs"), 1);
  EXPECT_EQ(place(stem, "job"), 1);
  EXPECT_EQ(place(form, "os"), 3);
  EXPECT_EQ(place(form, "os.path"), 4);
  EXPECT_EQ(place(bigram, "path wait"), 5);
  EXPECT_EQ(place(stem, "wait"), 5);
  EXPECT_EQ(place(bigram, "job wait"), 7);
  // In the title, wherever else.
  EXPECT_EQ(place(stem, "queue"), 0);
  EXPECT_EQ(place(form, "queue"), 10);
  // Nobody asks where phrases and titles are.
  EXPECT_EQ(place(phrase, "jobs"), LUXTokenCount::farDown);
  EXPECT_EQ(place(title, "print queue"), LUXTokenCount::farDown);
}

TEST(LUXIndexWriter, PlacesEndWhereAByteEnds) {
  std::string text;
  for (int i = 0; i < 400; ++i) {
    text += "word" + std::to_string(i) + " ";
  }
  const Places places = placesOf(*index({document("a", "", {text})}), "a");
  using enum LUXTokenKind;
  EXPECT_EQ(places.at(std::pair(stem, "word254")), 254);
  EXPECT_EQ(places.at(std::pair(stem, "word255")), 255);
  EXPECT_EQ(places.at(std::pair(stem, "word256")), 255);
  EXPECT_EQ(places.at(std::pair(stem, "word399")), 255);
}

TEST(LUXIndexWriter, PhrasesAreThereFromTwoPagesOnAndWordsAlways) {
  const auto opened = index({document("a", "", {"paper tray", "ink cartridge"}),
                             document("b", "", {"the paper tray of it"})});
  EXPECT_THAT(tokensOf(*opened, "a", LUXTokenKind::phrase),
              ElementsAre("cartridge", "ink", "paper", "paper tray", "tray"));
}

TEST(LUXIndexWriter, PhrasesHaveNoStopWordOrNumberAtTheirEdges) {
  const auto opened = index({document("a", "", {"the end of file 12 more"}),
                             document("b", "", {"the end of file 12 more"})});
  EXPECT_THAT(tokensOf(*opened, "a", LUXTokenKind::phrase),
              ElementsAre("end", "end of file", "file"));
}

TEST(LUXIndexWriter, WordsAreShownSmallUnlessAlwaysCapitalised) {
  const auto opened = index({document("a", "Writer Styles", {"Writer styles", "NEW paragraph"}),
                             document("b", "Writer Styles", {"New paragraph", "New Paragraph"})});
  EXPECT_THAT(
      tokensOf(*opened, "a", LUXTokenKind::phrase),
      ElementsAre("New", "New paragraph", "Writer", "Writer styles", "paragraph", "styles"));
}

TEST(LUXIndexWriter, PhrasesOfScriptsWithoutBlanksAreShownWithoutThem) {
  const auto opened =
      index({document("a", "", {"文字列の検索"}), document("b", "", {"文字列の検索"})}, "Japanese");
  EXPECT_THAT(tokensOf(*opened, "a", LUXTokenKind::phrase),
              ElementsAre("列", "列の検索", "文字", "文字列", "文字列の検索", "検索"));
}

TEST(LUXIndexWriter, RightToLeftBooksAreBooks) {
  const auto opened = index({document("a", "طباعة الملفات", {"الطابعة في المكتب"}),
                             document("b", "طباعة الملفات", {"شاشة"})},
                            "Arabic");
  EXPECT_THAT(tokensOf(*opened, "a", LUXTokenKind::phrase), Contains("طباعة الملفات"));
  EXPECT_THAT(tokensOf(*opened, "a", LUXTokenKind::form), Contains("المكتب"));
  EXPECT_THAT(tokensOf(*opened, "a", LUXTokenKind::stem), Not(Contains("في")));
}

TEST(LUXIndexWriter, TitlesAreTokensOfTheirOwn) {
  const auto opened =
      index({document("a", "How to Print Pages?", {}), document("b", "About", {}),
             document("c", "?", {"text"}), document("d", std::string(5000, 'x') + " y", {}),
             document("e",
                      std::string(2000, 'a') + " " + std::string(200, 'b') + " " +
                          std::string(250, 'c') + " " + std::string(250, 'd') + " " +
                          std::string(250, 'e') + " " + std::string(250, 'f'),
                      {})});
  EXPECT_THAT(tokensOf(*opened, "a", LUXTokenKind::title), ElementsAre("print page"));
  EXPECT_THAT(tokensOf(*opened, "b", LUXTokenKind::title), ElementsAre("about"));
  EXPECT_THAT(tokensOf(*opened, "c", LUXTokenKind::title), IsEmpty());
  EXPECT_THAT(tokensOf(*opened, "d", LUXTokenKind::title), testing::SizeIs(1));
  EXPECT_THAT(tokensOf(*opened, "e", LUXTokenKind::title), IsEmpty()) << "too long for a token";
}

TEST(LUXIndexWriter, ABookWithoutPagesIsABook) {
  const auto opened = index({});
  EXPECT_THAT(opened->documentKeys(), IsEmpty());
  EXPECT_TRUE(opened->tokenCountsForKey("a").empty());
  EXPECT_EQ(opened->attributes()[HelpLUXIndexAttributeBigramThresholdKey].doubleValue(), 0);
}

TEST(LUXIndexWriter, PagesOfOneWordAndOfNoneAreTaken) {
  const auto opened =
      index({document("a", "", {"word"}), document("b", "", {}), document("c", "", {" ... "})});
  EXPECT_EQ(opened->tokenCountsForKey("a").size(), 3U) << "stem, form and phrase";
  EXPECT_TRUE(opened->tokenCountsForKey("b").empty());
  EXPECT_TRUE(opened->tokenCountsForKey("c").empty());
}

TEST(LUXIndexWriter, AttributesNameTheLanguageAndTheThresholds) {
  std::vector<LUXDocument> pages;
  pages.reserve(4);
  for (int i = 0; i < 4; ++i) {
    pages.push_back(document(std::to_string(i), "",
                             {"paper tray", "ink jet", "print job", "wide screen", "paper tray"}));
  }
  const auto opened = index(pages, "German");
  const Value& attributes = opened->attributes();
  EXPECT_EQ(attributes[HelpLUXIndexAttributeLanguageKey], Value("de"));
  EXPECT_EQ(attributes[HelpLUXIndexAttributeTokenizerVersionKey], Value(HelpTokenizer::version()));
  EXPECT_GT(attributes[HelpLUXIndexAttributeBigramThresholdKey].doubleValue(), 0)
      << "twelve phrases for a budget of four";
  EXPECT_EQ(attributes[HelpLUXIndexAttributeTrigramThresholdKey].doubleValue(), 0);
  EXPECT_TRUE(attributes[HelpLUXIndexAttributeIgnoreLUXKey].isAbsent());
}

TEST(HelpLUXIndex, PagesShareTheTableAsLongAsItLives) {
  const auto opened = index(example());
  const LUXTokenCounts first = opened->tokenCountsForKey("a.html");
  EXPECT_EQ(opened->tokenCountsForKey("b.html").table(), first.table());
}

TEST(HelpLUXIndex, CountsOutliveTheIndex) {
  LUXTokenCounts counts;
  { counts = index(example())->tokenCountsForKey("a.html"); }
  ASSERT_FALSE(counts.empty());
  EXPECT_EQ(counts[0].token, "print");
}

TEST(HelpLUXIndex, WritesPagesAgainAsItReadThem) {
  const Data bytes = written(example());
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(bytes)->versionedData(), bytes);
}

TEST(HelpLUXIndex, SectionsThatAreMissingCountAsEmpty) {
  const auto sections = LUXSectionedData::read(written(example()));
  ASSERT_TRUE(sections);
  for (const uint32_t missing : {2U, 3U, 4U, 5U}) {
    std::vector<LUXSection> rest;
    for (const LUXSection& section : sections->sections()) {
      if (section.type != missing) {
        rest.push_back(section);
      }
    }
    const auto opened = HelpLUXIndex::initWithVersionedData(LUXSectionedData(rest).write());
    ASSERT_NE(opened, nullptr);
    EXPECT_EQ(opened->documentKeys().size(), missing == 3 ? 0U : 3U);
    EXPECT_EQ(opened->tokenCountsForKey("a.html").empty(), missing != 4) << missing;
    if (missing == 4) {
      EXPECT_EQ(opened->fileProperitesForKey("a.html"), Value(Value::Dictionary{}));
    }
  }
}

TEST(HelpLUXIndex, WithoutPlacesEveryTokenIsFarDown) {
  const auto sections = LUXSectionedData::read(written(example()));
  ASSERT_TRUE(sections);
  for (const bool areWrong : {false, true}) {
    std::vector<LUXSection> rest;
    for (const LUXSection& section : sections->sections()) {
      if (section.type != HelpLUXIndex::placesSectionType) {
        rest.push_back(section);
      }
    }
    if (areWrong) {
      // Records of the wrong length.
      LUXRecordsWriter records;
      for (int i = 0; i < 3; ++i) {
        records.beginRecord() += "x";
      }
      rest.push_back(
          LUXSection::sectionWithBytes(HelpLUXIndex::placesSectionType, records.finish()));
    }
    const auto opened = HelpLUXIndex::initWithVersionedData(LUXSectionedData(rest).write());
    ASSERT_NE(opened, nullptr);
    const Places places = placesOf(*opened, "a.html");
    EXPECT_FALSE(places.empty());
    for (const auto& [token, place] : places) {
      EXPECT_EQ(place, LUXTokenCount::farDown) << token.second;
    }
    EXPECT_EQ(countsOf(*opened, "a.html"),
              countsOf(*HelpLUXIndex::initWithVersionedData(written(example())), "a.html"));
  }
}

TEST(HelpLUXIndex, NoFlippedByteGivesOtherPages) {
  const std::string bytes(written(example()).view());
  const auto original = HelpLUXIndex::initWithVersionedData(Data::copy(bytes));
  std::map<std::string, Counts> counts;
  for (const std::string& key : original->documentKeys()) {
    counts[key] = countsOf(*original, key);
  }
  for (size_t offset = 0; offset < bytes.size(); ++offset) {
    std::string damaged = bytes;
    damaged[offset] = static_cast<char>(damaged[offset] ^ (1 << (offset % 8)));
    const auto opened = HelpLUXIndex::initWithVersionedData(Data::copy(damaged));
    if (opened == nullptr) {
      continue;
    }
    for (const std::string& key : opened->documentKeys()) {
      const Counts read = countsOf(*opened, key);
      EXPECT_TRUE(read.empty() || read == counts[key]) << offset;
      const Value properties = opened->fileProperitesForKey(key);
      EXPECT_TRUE(properties.dictionaryIf()->empty() ||
                  properties == original->fileProperitesForKey(key))
          << offset;
    }
  }
}

TEST(HelpLUXIndex, NoTruncationOpens) {
  const std::string bytes(written(example()).view());
  for (size_t length = 0; length < bytes.size(); ++length) {
    EXPECT_EQ(HelpLUXIndex::initWithVersionedData(Data::copy(bytes.substr(0, length))), nullptr);
  }
}

TEST(HelpLUXIndex, BytesWithTheRightChecksumAreNotTrustedEither) {
  const auto sections = LUXSectionedData::read(written(example()));
  std::mt19937 random(5);
  for (const LUXSection& section : sections->sections()) {
    for (size_t offset = 0; offset < section.bytes.length(); ++offset) {
      std::string damaged(section.bytes.view());
      damaged[offset] = static_cast<char>(random());
      if (random() % 4 == 0) {
        damaged.resize(random() % (damaged.size() + 1));
      }
      std::vector<LUXSection> others;
      for (const LUXSection& other : sections->sections()) {
        others.push_back(other.type == section.type
                             ? LUXSection::sectionWithBytes(other.type, Data::copy(damaged))
                             : other);
      }
      const auto opened = HelpLUXIndex::initWithVersionedData(LUXSectionedData(others).write());
      if (opened == nullptr) {
        continue;
      }
      for (const std::string& key : opened->documentKeys()) {
        const LUXTokenCounts counts = opened->tokenCountsForKey(key);
        for (size_t i = 0; i < counts.size(); ++i) {
          EXPECT_FALSE(counts[i].token.empty());
        }
        // What is delivered can be written: it is text.
        platform::dataFromPropertyList(opened->fileProperitesForKey(key),
                                       platform::PropertyListFormat::binary);
      }
    }
  }
}

TEST(HelpLUXIndex, ThreadsMayAskTheSameIndex) {
  const auto opened = index(example());
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      for (int round = 0; round < 100; ++round) {
        EXPECT_FALSE(opened->tokenCountsForKey("b.html").empty());
        EXPECT_FALSE(opened->fileProperitesForKey("a.html").isAbsent());
        EXPECT_EQ(opened->documentKeys().size(), 3U);
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

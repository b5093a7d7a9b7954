#include <gtest/gtest.h>

#include <algorithm>
#include <set>

#include "SearchKit/IndexReader.h"
#include "SearchKit/SearchKit.h"
#include "tests/plugin/keyword/KeywordWorld.h"

using platform::URL;
using platform::Value;
using searchkit::Document;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using testing::UnorderedElementsAre;
using tests::KeywordWorld;
using tests::page;
using tests::titlesOf;
using tests::urlOf;
using tests::urlsOf;

namespace {

std::vector<Document> pages(size_t count, const std::string& prefix, const std::string& text) {
  std::vector<Document> result;
  for (size_t i = 0; i < count; ++i) {
    result.push_back(page("/" + prefix + std::to_string(i) + ".html", "Title", text));
  }
  return result;
}

std::vector<Document> both(std::vector<Document> a, std::vector<Document> b) {
  std::move(b.begin(), b.end(), std::back_inserter(a));
  return a;
}

URL url(std::string_view string) { return URL::URLWithString(string).value(); }

// Every hit of a query, straight from the engine.
std::vector<std::pair<SKDocumentID, float>> allHits(const SKIndexRef& index,
                                                    std::string_view query) {
  std::vector<std::pair<SKDocumentID, float>> hits;
  const SKSearchRef search = SKSearchCreate(index, query, kSKSearchOptionDefault);
  bool more = true;
  while (more) {
    SKDocumentID ids[64];
    float scores[64];
    size_t found = 0;
    more = SKSearchFindMatches(*search, 64, ids, scores, 1.0, &found);
    for (size_t i = 0; i < found; ++i) {
      hits.emplace_back(ids[i], scores[i]);
    }
  }
  return hits;
}

}  // namespace

TEST(ZEBHelpindexSearchController, BeginsWithoutAnOwnerAndKeepsTheOneItIsGiven) {
  const auto controller = ZEBHelpindexSearchController::init();
  EXPECT_EQ(controller->pluginOwner(), nullptr);
  auto owner = std::make_shared<tests::BookOwner>();
  const std::weak_ptr<tests::BookOwner> watch = owner;
  controller->setPluginOwner(owner);
  EXPECT_EQ(controller->pluginOwner(), owner);
  owner.reset();
  EXPECT_FALSE(watch.expired()) << "the controller holds its owner";
  controller->setPluginOwner(nullptr);
  EXPECT_TRUE(watch.expired());
}

TEST(ZEBHelpindexSearchController, ResultHasTitleKindScoreAndExactlyFourEntries) {
  const KeywordWorld world;
  const auto index = world.index({page("/print.html", "Printing", "Use the printer.")});
  const auto results = world.controller->doSearchForString("printing", {index}, {});
  ASSERT_THAT(results, SizeIs(1));
  const ZEBResult& result = *results[0];
  EXPECT_EQ(result.title(), "Printing");
  EXPECT_EQ(result.type(), ZEBHelpArticleResult);
  const auto hits = allHits(index->copyIndexRef(), "printing* ");
  ASSERT_THAT(hits, SizeIs(1));
  EXPECT_EQ(result.relevance().kind(), Value::Kind::real);
  EXPECT_EQ(result.relevance().doubleValue(), static_cast<double>(hits[0].second));
  EXPECT_EQ(result.payload(),
            (Value::Dictionary{{ZEBResultURLKey, world.fileURL("book/print.html")},
                               {ZEBResultAbstractKey, "About Printing"},
                               {ZEBResultIndexIDKey, index->indexID()},
                               {ZEBResultBookIDKey, "book"}}));
  EXPECT_FALSE(result.isPayloadMutable());
  EXPECT_EQ(result.bookID(), "book");
}

TEST(ZEBHelpindexSearchController, TermsMatchAsPrefixesUnlessTheQueryHasOperators) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "Queues", "of the printer")});
  EXPECT_THAT(world.controller->doSearchForString("print qu", {index}, {}), SizeIs(1));
  EXPECT_THAT(world.controller->doSearchForString("\"print\"", {index}, {}), IsEmpty());
  EXPECT_THAT(world.controller->doSearchForString("\"printer\"", {index}, {}), SizeIs(1));
}

TEST(ZEBHelpindexSearchController, QueryOfPunctuationFindsNothing) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "Queues", "of the printer")});
  EXPECT_THAT(world.controller->doSearchForString("?.,", {index}, {}), IsEmpty());
  EXPECT_THAT(world.controller->doSearchForString("", {index}, {}), IsEmpty());
}

TEST(ZEBHelpindexSearchController, AllTermsPassNeedsEveryTermAndAnyTermPassOne) {
  const KeywordWorld world;
  const auto index =
      world.index({page("/both.html", "Both", "applet banana"), page("/one.html", "One", "applet"),
                   page("/none.html", "None", "cherry")});
  EXPECT_THAT(titlesOf(world.controller->_doSearchForString("applet banana", {index}, {}, true)),
              ElementsAre("Both"));
  EXPECT_THAT(titlesOf(world.controller->_doSearchForString("applet banana", {index}, {}, false)),
              UnorderedElementsAre("Both", "One"));
}

TEST(ZEBHelpindexSearchController, FourteenResultsWidenTheSearchAndFifteenDoNot) {
  const KeywordWorld world;
  const auto fourteen = world.index(
      both(pages(14, "both", "applet banana"), pages(5, "one", "applet")), "book/14.helpindex");
  EXPECT_THAT(world.controller->_doSearchForString("applet banana", {fourteen}, {}, true),
              SizeIs(14));
  EXPECT_THAT(world.controller->doSearchForString("applet banana", {fourteen}, {}), SizeIs(19));
  const auto fifteen = world.index(
      both(pages(15, "both", "applet banana"), pages(5, "one", "applet")), "book/15.helpindex");
  EXPECT_THAT(world.controller->doSearchForString("applet banana", {fifteen}, {}), SizeIs(15));
}

TEST(ZEBHelpindexSearchController, ResultsAreCountedOverAllIndices) {
  const KeywordWorld world;
  const auto a = world.index(both(pages(8, "both", "applet banana"), pages(5, "one", "applet")),
                             "a/a.helpindex");
  const auto b = world.index(both(pages(7, "both", "applet banana"), pages(5, "one", "applet")),
                             "b/b.helpindex");
  EXPECT_THAT(world.controller->doSearchForString("applet banana", {a, b}, {}), SizeIs(15));
}

TEST(ZEBHelpindexSearchController, PageFoundByBothPassesComesOnceAndTheAllTermsRecordStays) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "First", "applet banana")});
  const platform::Data second = platform::classicArchiveWithRootObject(Value::Dictionary{
      {"SKI_INDEX_DATA", tests::keywordIndex({page("/a.html", "Second", "applet banana"),
                                              page("/b.html", "Other", "applet")})}});
  // The index changes between the passes, which tells the records of one from those of the other.
  int asked = 0;
  world.owner->onBookWithID = [&] {
    if (++asked == 2) {
      index->reinitializeWithData(second);
    }
  };
  const auto results = world.controller->doSearchForString("applet banana", {index}, {});
  EXPECT_EQ(asked, 2);
  EXPECT_THAT(titlesOf(results), UnorderedElementsAre("First", "Other"));
}

TEST(ZEBHelpindexSearchController, ResultsComeIndexByIndexInTheOrderGiven) {
  const KeywordWorld world;
  const auto a = world.index({page("/a.html", "A", "applet")}, "a/a.helpindex");
  const auto b = world.index({page("/b.html", "B", "applet applet applet")}, "b/b.helpindex");
  EXPECT_THAT(titlesOf(world.controller->_doSearchForString("applet", {b, a}, {}, true)),
              ElementsAre("B", "A"));
  EXPECT_THAT(titlesOf(world.controller->_doSearchForString("applet", {a, b}, {}, true)),
              ElementsAre("A", "B"));
}

TEST(ZEBHelpindexSearchController, OnlySearchableHelpIndexRecordsAreSearched) {
  const KeywordWorld world;
  const auto good = world.index({page("/a.html", "A", "applet")}, "a/a.helpindex");
  const auto withoutTerms = world.index({}, "b/b.helpindex");
  ASSERT_NE(withoutTerms->copyIndexRef(), nullptr);
  ASSERT_FALSE(withoutTerms->isSearchable());
  int asked = 0;
  world.owner->onBookWithID = [&] { ++asked; };
  EXPECT_THAT(world.controller->doSearchForString(
                  "applet", {nullptr, ZEBIndex::initWithPath("/a.helpindex"), withoutTerms}, {}),
              IsEmpty());
  EXPECT_EQ(asked, 0);
  EXPECT_THAT(world.controller->doSearchForString("applet", {}, {}), IsEmpty());
  EXPECT_THAT(world.controller->_doSearchForString(
                  "applet", {nullptr, ZEBIndex::init(), withoutTerms, good}, {}, true),
              SizeIs(1));
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(ZEBHelpindexSearchController, IndexThatCannotBeOpenedContributesNothingSilently) {
  const KeywordWorld world;
  const auto good = world.index({page("/a.html", "A", "applet")}, "a/a.helpindex");
  const auto broken = ZEBHelpindexIndex::initWithPath(
      world.write("broken.helpindex", {{"SKI_INDEX_DATA", platform::Data::copy("broken")}}));
  const auto empty = ZEBHelpindexIndex::initWithPath(world.write("empty.helpindex", {}));
  world.log->clear();
  EXPECT_THAT(world.controller->doSearchForString("applet", {broken, empty, good}, {}), SizeIs(1));
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(ZEBHelpindexSearchController, LeavesNoReferenceBehind) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "A", "applet")});
  world.controller->doSearchForString("applet", {index}, {});
  // Without data of its own the record would give the last reference, if anybody still held it.
  index->reinitializeWithData(platform::classicArchiveWithRootObject(Value::Dictionary{}));
  EXPECT_EQ(index->copyIndexRef(), nullptr);
}

TEST(ZEBHelpindexSearchController, OfSixHundredHitsTheFiveHundredBestAreKept) {
  const KeywordWorld world;
  std::vector<Document> documents;
  std::string text = "needle";
  for (int i = 0; i < 600; ++i) {
    // Longer pages score less for the same word.
    documents.push_back(page("/" + std::to_string(i) + ".html", "Title", text));
    text += " w" + std::to_string(i);
  }
  const auto index = world.index(std::move(documents));
  const SKIndexRef indexRef = index->copyIndexRef();
  auto hits = allHits(indexRef, "needle*");
  ASSERT_THAT(hits, SizeIs(600));
  std::sort(hits.begin(), hits.end(),
            [](const auto& a, const auto& b) { return a.second > b.second; });
  std::multiset<double> expected;
  for (size_t i = 0; i < 600; ++i) {
    ASSERT_TRUE(i == 0 || hits[i].second < hits[i - 1].second) << "all scores differ";
    if (i < 500) {
      expected.insert(static_cast<double>(hits[i].second));
    }
  }
  const auto results = world.controller->_doSearchForString("needle", {index}, {}, true);
  std::multiset<double> scores;
  for (const auto& result : results) {
    scores.insert(result->relevance().doubleValue());
  }
  EXPECT_EQ(scores, expected);
}

TEST(ZEBHelpindexSearchController, HitThatTiesWithTheWorstMakesFiveHundredAndOne) {
  const KeywordWorld world;
  const auto index = world.index(pages(501, "page", "needle in hay"));
  EXPECT_THAT(world.controller->_doSearchForString("needle", {index}, {}, true), SizeIs(501));
}

TEST(ZEBHelpindexSearchController, PagesOfALocalBookLieBesideItsIndexFile) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType1)->setAccessPagePath("/elsewhere/index.html");
  const auto index = world.index({page("/sub/a.html", "A", "applet")});
  EXPECT_THAT(urlsOf(world.controller->doSearchForString("applet", {index}, {})),
              ElementsAre(world.fileURL("book/sub/a.html")));
}

TEST(ZEBHelpindexSearchController, PagesOfAGeneratedIndexLieBesideTheAccessPage) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType1)->setAccessPagePath("/books/manual/index.html");
  const auto index = world.index({page("/sub/a.html", "A", "applet")});
  index->setLoadedFromGeneratedCache(true);
  EXPECT_THAT(urlsOf(world.controller->doSearchForString("applet", {index}, {})),
              ElementsAre("file:///books/manual/sub/a.html"));
}

TEST(ZEBHelpindexSearchController, BookThatTheOwnerDoesNotKnowIsSearchedAsALocalOne) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "A", "applet")});
  EXPECT_THAT(urlsOf(world.controller->doSearchForString("applet", {index}, {})),
              ElementsAre(world.fileURL("book/a.html")));
}

TEST(ZEBHelpindexSearchController, GeneratedIndexWithoutItsBookHasNoParentPath) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "A", "applet")});
  index->setLoadedFromGeneratedCache(true);
  EXPECT_THAT(urlsOf(world.controller->doSearchForString("applet", {index}, {})),
              ElementsAre("file://(null)/a.html"));
}

TEST(ZEBHelpindexSearchController, WithoutAnOwnerNoBookIsKnown) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType4);
  world.controller->setPluginOwner(nullptr);
  const auto index = world.index({page("/a.html", "A", "applet")});
  EXPECT_THAT(urlsOf(world.controller->doSearchForString("applet", {index}, {})),
              ElementsAre(world.fileURL("book/a.html")));
}

TEST(ZEBHelpindexSearchController, PagesOfARemoteBookHaveTheURLUnderWhichTheServerHasThem) {
  const KeywordWorld world;
  const auto book = world.owner->addBook("book", ZEBHelpBookType4);
  book->setRemoteURL(url("https://help.example/book/"));
  const auto index = world.index({page("/my page.html", "A", "applet")});
  const auto expected = ZEBHelpBook::_urlForType4HelpBookResult("/my page.html", "book");
  ASSERT_TRUE(expected);
  EXPECT_THAT(urlsOf(world.controller->doSearchForString("applet", {index}, {})),
              ElementsAre(expected->absoluteString()));
}

TEST(ZEBHelpindexSearchController, RemotePageWithoutAURLIsLoggedWithoutAFileURLAndDropped) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType4);
  const auto index = world.index({page("/a.html", "A", "applet")});
  EXPECT_THAT(world.controller->_doSearchForString("applet", {index}, {}, true), IsEmpty());
  EXPECT_THAT(world.log->entries(),
              ElementsAre(platform::CapturingLogSink::Entry{
                  1,
                  "Problems with creating the result dictionary for (null):\nurl: "
                  "(null)\nabstract: About A"}));
}

TEST(ZEBHelpindexSearchController, PageWithoutAnAbstractIsLoggedAndDropped) {
  const KeywordWorld world;
  Document document = page("/my page.html", "A", "applet");
  document.abstract.reset();
  const auto index = world.index({document, page("/b.html", "B", "applet")});
  EXPECT_THAT(titlesOf(world.controller->_doSearchForString("applet", {index}, {}, true)),
              ElementsAre("B"));
  EXPECT_THAT(world.log->entries(), ElementsAre(platform::CapturingLogSink::Entry{
                                        1, "Problems with creating the result dictionary for " +
                                               world.fileURL("book/my page.html") +
                                               ":\nurl: " + world.fileURL("book/my%20page.html") +
                                               "\nabstract: (null)"}));
}

TEST(ZEBHelpindexSearchController, RecordWithoutABookGivesIncompleteResultsThatAreDropped) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "A", "applet")});
  index->setBookID(std::nullopt);
  int asked = 0;
  world.owner->onBookWithID = [&] { ++asked; };
  EXPECT_THAT(world.controller->_doSearchForString("applet", {index}, {}, true), IsEmpty());
  EXPECT_EQ(asked, 0);
  EXPECT_THAT(
      world.log->entries(),
      ElementsAre(platform::CapturingLogSink::Entry{
          1, "Problems with creating the result dictionary for " + world.fileURL("book/a.html") +
                 ":\nurl: " + world.fileURL("book/a.html") + "\nabstract: About A"}));
}

TEST(ZEBHelpindexSearchController, PageWithoutPropertiesIsLoggedByNameAndTheOthersStay) {
  const KeywordWorld world;
  Document bare;
  bare.path = "/sub/bare.html";
  bare.body = {"applet"};
  const auto index = world.index({bare, page("/b.html", "B", "applet")});
  EXPECT_THAT(titlesOf(world.controller->_doSearchForString("applet", {index}, {}, true)),
              ElementsAre("B"));
  EXPECT_THAT(world.log->entries(), ElementsAre(platform::CapturingLogSink::Entry{
                                        1, "No properties for document bare.html"}));
}

TEST(ZEBHelpindexSearchController, PageWithoutATitleIsAResultWithoutOne) {
  const KeywordWorld world;
  Document document = page("/a.html", "A", "applet");
  document.title.reset();
  const auto index = world.index({document});
  const auto results = world.controller->doSearchForString("applet", {index}, {});
  ASSERT_THAT(results, SizeIs(1));
  EXPECT_EQ(results[0]->title(), std::nullopt);
}

TEST(ZEBHelpindexSearchController, IgnoredURLsLeavePagesOut) {
  const KeywordWorld world;
  const auto index =
      world.index({page("/a.html", "A", "applet"), page("/b c.html", "B", "applet")});
  EXPECT_THAT(titlesOf(world.controller->doSearchForString(
                  "applet", {index}, {world.fileURL("x.html"), world.fileURL("book/b%20c.html")})),
              ElementsAre("A"));
  EXPECT_THAT(
      world.controller->doSearchForString(
          "applet", {index}, {world.fileURL("book/a.html"), world.fileURL("book/b%20c.html")}),
      IsEmpty());
}

TEST(ZEBHelpindexSearchController, IgnoredPagesNeedNoProperties) {
  const KeywordWorld world;
  Document bare;
  bare.path = "/bare.html";
  bare.body = {"applet"};
  const auto index = world.index({bare});
  EXPECT_THAT(
      world.controller->doSearchForString("applet", {index}, {world.fileURL("book/bare.html")}),
      IsEmpty());
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(ZEBHelpindexSearchController, IgnoredFileURLSpelledOtherwiseLeavesThePageOutByItsPath) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "A", "applet")});
  EXPECT_THAT(
      world.controller->doSearchForString("applet", {index}, {world.fileURL("book/%61.html")}),
      IsEmpty());
  EXPECT_THAT(
      world.controller->doSearchForString("applet", {index}, {world.fileURL("book/a.html#top")}),
      IsEmpty());
}

TEST(ZEBHelpindexSearchController, IgnoredStringsThatAreNotEscapedOrNoURLsDoNoHarm) {
  const KeywordWorld world;
  const auto index = world.index({page("/a b.html", "A", "applet")});
  EXPECT_THAT(
      world.controller->doSearchForString("applet", {index}, {world.fileURL("book/a b.html")}),
      IsEmpty());
  EXPECT_THAT(
      world.controller->doSearchForString(
          "applet", {index}, {"", std::string("\0", 1), "a b.html", "%", "http://x/a.html"}),
      SizeIs(1));
}

TEST(ZEBHelpindexSearchController, EmptyIgnoreListLeavesNothingOut) {
  const KeywordWorld world;
  const auto index = world.index({page("/a.html", "A", "applet"), page("/b.html", "B", "applet")});
  EXPECT_THAT(world.controller->doSearchForString("applet", {index}, {}), SizeIs(2));
}

TEST(ZEBHelpindexSearchController, RemotePagesAreLeftOutByURLOnly) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType4)->setRemoteURL(url("https://help.example/book/"));
  const auto index = world.index({page("/a.html", "A", "applet")});
  const auto results = world.controller->doSearchForString("applet", {index}, {});
  ASSERT_THAT(results, SizeIs(1));
  const std::string pageURL = urlOf(results[0]);
  EXPECT_THAT(world.controller->doSearchForString("applet", {index}, {"file:///book/a.html"}),
              SizeIs(1));
  EXPECT_THAT(world.controller->doSearchForString("applet", {index}, {pageURL + "?x"}), SizeIs(1));
  EXPECT_THAT(world.controller->doSearchForString("applet", {index}, {pageURL}), IsEmpty());
}

TEST(ZEBHelpindexSearchController, URLsAreEqualWhenTheirAbsoluteFormsAre) {
  const auto equal = &ZEBHelpindexSearchController::_urlIsEqualToURL;
  const URL base = url("https://help.example/a/");
  const URL relative = URL::URLWithStringRelativeToURL("b.html", base).value();
  EXPECT_TRUE(equal(relative, url("https://help.example/a/b.html")));
  EXPECT_TRUE(equal(url("https://help.example/a/b.html"), relative));
  EXPECT_FALSE(equal(url("https://help.example/a"), url("https://help.example/b")));
  EXPECT_FALSE(equal(url("https://help.example/a"), url("https://help.example/%61")));
}

TEST(ZEBHelpindexSearchController, FileURLsAreEqualWhenTheirPathsAre) {
  const auto equal = &ZEBHelpindexSearchController::_urlIsEqualToURL;
  EXPECT_TRUE(equal(url("file:///a/b.html"), url("file:///a/%62.html")));
  EXPECT_TRUE(equal(url("file:///a/b.html"), url("file:///a/b.html#x")));
  EXPECT_TRUE(equal(url("file:///a/b.html"), url("file://localhost/a/b.html")));
  EXPECT_TRUE(equal(URL::URLWithStringRelativeToURL("b.html", url("file:///a/")).value(),
                    url("file:///a/b%2Ehtml")));
  EXPECT_FALSE(equal(url("file:///a/b.html"), url("file:///a/B.html")));
}

TEST(ZEBHelpindexSearchController, FileURLNeverEqualsAnotherKindOfURL) {
  const auto equal = &ZEBHelpindexSearchController::_urlIsEqualToURL;
  EXPECT_FALSE(equal(url("file:///a/b.html"), url("https://help.example/a/b.html")));
  EXPECT_FALSE(equal(url("https://help.example/a/b.html"), url("file:///a/b.html")));
  EXPECT_FALSE(equal(url("file:///a/b.html"), url("/a/b.html")));
}

TEST(ZEBHelpindexSearchController, ListContainsAURLWhenAnyElementEqualsIt) {
  const auto contains = &ZEBHelpindexSearchController::_arrayOfURLsContainsURL;
  const std::vector<URL> urls = {url("https://help.example/a"), url("file:///a/%62")};
  EXPECT_TRUE(contains(urls, url("https://help.example/a")));
  EXPECT_TRUE(contains(urls, url("file:///a/b")));
  EXPECT_FALSE(contains(urls, url("file:///a")));
  EXPECT_FALSE(contains({}, url("file:///a")));
}

TEST(ZEBHelpindexSearchController, ResultsAreWholeWhenRecordFileAndControllerAreGone) {
  std::vector<std::shared_ptr<ZEBResult>> results;
  std::string url;
  {
    const KeywordWorld world;
    const auto index = world.index({page("/a b.html", "Title", "applet")});
    url = "file://" + world.folder.path("book/") + "a%20b.html";
    results = world.controller->doSearchForString("applet", {index}, {});
  }
  ASSERT_THAT(results, SizeIs(1));
  EXPECT_EQ(results[0]->title(), "Title");
  EXPECT_EQ(urlOf(results[0]), url);
}

// Two paths that come to the same URL are one page, in whichever way their records are made.
TEST(ZEBHelpindexSearchController, PathsOfTheSameURLAreOneResult) {
  const KeywordWorld world;
  const auto index =
      world.index({page("/a b.html", "Blank", "applet"), page("/a%20b.html", "Escape", "applet")});
  EXPECT_THAT(world.controller->doSearchForString("applet", {index}, {}), SizeIs(1));
}

TEST(ZEBHelpindexSearchController, PagesOfOneBookInTwoIndicesAreOneResult) {
  const KeywordWorld world;
  const auto a = world.index({page("/a.html", "Title", "applet")});
  const auto b = world.index({page("/a.html", "Title", "applet")}, "book/b.helpindex");
  EXPECT_THAT(world.controller->doSearchForString("applet", {a, b}, {}), SizeIs(1));
  EXPECT_THAT(world.controller->doSearchForString("applet", {a, a, nullptr}, {}), SizeIs(1));
}

TEST(ZEBHelpindexSearchController, PlainAndOtherIndicesGiveTheSameResults) {
  const KeywordWorld world;
  const std::vector<Document> plain = pages(8, "page", "applet banana");
  const auto a = world.index(plain);
  const auto b =
      world.index(both(plain, {page("/odd%41.html", "Odd", "cherry")}), "other/b.helpindex");
  b->setBookID("other");
  const auto results = world.controller->doSearchForString("applet", {a, b}, {});
  ASSERT_THAT(results, SizeIs(16));
  for (size_t i = 0; i < 8; ++i) {
    EXPECT_EQ(results[i]->title(), results[i + 8]->title());
    EXPECT_EQ(results[i]->payload().size(), 4U);
    EXPECT_EQ(results[i + 8]->payload().size(), 4U);
    EXPECT_EQ(results[i]->relevance().kind(), results[i + 8]->relevance().kind());
  }
}

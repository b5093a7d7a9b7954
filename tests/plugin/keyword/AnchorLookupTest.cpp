#include <gtest/gtest.h>

#include "tests/plugin/keyword/KeywordWorld.h"

using platform::Value;
using searchkit::Document;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using tests::anchors;
using tests::KeywordWorld;
using tests::page;
using tests::titlesOf;
using tests::urlOf;
using tests::urlsOf;

namespace {

using Entry = platform::CapturingLogSink::Entry;

std::string utf8(std::u8string_view text) { return {text.begin(), text.end()}; }

std::shared_ptr<ZEBHelpindexIndex> indexWithAnchors(const KeywordWorld& world,
                                                    std::vector<Document> pages, Value anchorData,
                                                    const std::string& name = "book/a.helpindex") {
  return world.index(std::move(pages), name, {{"SKI_ANCHOR_DATA", std::move(anchorData)}});
}

}  // namespace

TEST(AnchorLookup, ResultHasTitleKindRelevanceOneAndAPayloadThatMayGrow) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {"/a.html"}}}));
  const auto results = world.controller->doLookupOfAnchor("top", {index});
  ASSERT_THAT(results, SizeIs(1));
  EXPECT_EQ(results[0]->title(), "A");
  EXPECT_EQ(results[0]->type(), ZEBHelpArticleResult);
  EXPECT_EQ(results[0]->relevance(), Value(1));
  EXPECT_EQ(results[0]->relevance().kind(), Value::Kind::integer);
  EXPECT_EQ(results[0]->payload(),
            (Value::Dictionary{{ZEBResultURLKey, world.fileURL("book/a.html")},
                               {ZEBResultAbstractKey, "About A"},
                               {ZEBResultIndexIDKey, index->indexID()},
                               {ZEBResultBookIDKey, "book"}}));
  EXPECT_TRUE(results[0]->isPayloadMutable());
}

TEST(AnchorLookup, AnchorNobodyKnowsYieldsNothingAndOneLineAnIndex) {
  const KeywordWorld world;
  const auto a = indexWithAnchors(world, {page("/a.html", "A", "applet")},
                                  anchors({{"top", {"/a.html"}}}), "a/a.helpindex");
  const auto b = indexWithAnchors(world, {page("/b.html", "B", "applet")},
                                  anchors({{"end", {"/b.html"}}}), "b/b.helpindex");
  EXPECT_THAT(world.controller->doLookupOfAnchor("middle", {a, b}), IsEmpty());
  EXPECT_THAT(world.log->entries(), ElementsAre(Entry{3, "Path array for index: (null)"},
                                                Entry{3, "Path array for index: (null)"}));
}

TEST(AnchorLookup, NameIsTakenExactlyAsGiven) {
  const KeywordWorld world;
  const auto index = indexWithAnchors(world, {page("/a.html", "A", "applet")},
                                      anchors({{"Top", {"/a.html"}}, {"", {"/a.html"}}}));
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), IsEmpty());
  EXPECT_THAT(world.controller->doLookupOfAnchor("Top ", {index}), IsEmpty());
  EXPECT_THAT(world.controller->doLookupOfAnchor("Top", {index}), SizeIs(1));
  EXPECT_THAT(world.controller->doLookupOfAnchor("", {index}), SizeIs(1));
}

TEST(AnchorLookup, AnchorOnThreePagesYieldsThreeResultsInTheOrderOfTheList) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world,
                       {page("/a.html", "A", "applet"), page("/b.html", "B", "applet"),
                        page("/c.html", "C", "applet")},
                       anchors({{"top", {"/c.html", "/a.html", "/b.html"}}}));
  const auto results = world.controller->doLookupOfAnchor("top", {index});
  EXPECT_THAT(titlesOf(results), ElementsAre("C", "A", "B"));
  for (const auto& result : results) {
    EXPECT_EQ(result->relevance(), Value(1));
  }
}

TEST(AnchorLookup, LogsThePathsOnceAndTheParentPathForEach) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet"), page("/b.html", "B", "applet")},
                       anchors({{"top", {"/a.html", "/b.html"}}}));
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), SizeIs(2));
  const std::string parent = "parent path: " + world.folder.path("book");
  EXPECT_THAT(world.log->entries(),
              ElementsAre(Entry{3, R"(Path array for index: ["/a.html", "/b.html"])"},
                          Entry{3, parent}, Entry{3, parent}));
}

TEST(AnchorLookup, SamePageInTwoIndicesComesTwice) {
  const KeywordWorld world;
  const auto a = indexWithAnchors(world, {page("/p.html", "P", "applet")},
                                  anchors({{"top", {"/p.html"}}}), "book/a.helpindex");
  const auto b = indexWithAnchors(world, {page("/p.html", "P", "applet")},
                                  anchors({{"top", {"/p.html"}}}), "book/b.helpindex");
  const auto results = world.controller->doLookupOfAnchor("top", {a, b});
  ASSERT_THAT(results, SizeIs(2));
  EXPECT_EQ(*results[0], *results[1]);
  EXPECT_EQ(results[0]->payloadValueForKey(ZEBResultIndexIDKey), Value(a->indexID()));
  EXPECT_EQ(results[1]->payloadValueForKey(ZEBResultIndexIDKey), Value(b->indexID()));
}

TEST(AnchorLookup, SamePathTwiceInTheListComesTwice) {
  const KeywordWorld world;
  const auto index = indexWithAnchors(world, {page("/a.html", "A", "applet")},
                                      anchors({{"top", {"/a.html", "/a.html"}}}));
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), SizeIs(2));
}

TEST(AnchorLookup, PageWithoutAnAbstractIsAResultWithoutOne) {
  const KeywordWorld world;
  Document document = page("/a.html", "A", "applet");
  document.abstract.reset();
  const auto index = indexWithAnchors(world, {document}, anchors({{"top", {"/a.html"}}}));
  const auto results = world.controller->doLookupOfAnchor("top", {index});
  ASSERT_THAT(results, SizeIs(1));
  EXPECT_EQ(results[0]->payload().count(ZEBResultAbstractKey), 0U);
  EXPECT_EQ(results[0]->payload().size(), 3U);
}

TEST(AnchorLookup, RecordWithoutABookGivesAResultWithoutOne) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {"/a.html"}}}));
  index->setBookID(std::nullopt);
  const auto results = world.controller->doLookupOfAnchor("top", {index});
  ASSERT_THAT(results, SizeIs(1));
  EXPECT_EQ(results[0]->bookID(), std::nullopt);
}

TEST(AnchorLookup, RecordsWithoutAnchorsOrTermsAndOtherRecordsArePassedOverSilently) {
  const KeywordWorld world;
  const auto withoutAnchors = world.index({page("/a.html", "A", "applet")}, "a/a.helpindex");
  const auto withoutTerms =
      indexWithAnchors(world, {}, anchors({{"top", {"/a.html"}}}), "b/b.helpindex");
  ASSERT_NE(withoutTerms->copyIndexRef(), nullptr);
  EXPECT_THAT(world.controller->doLookupOfAnchor(
                  "top", {nullptr, ZEBIndex::init(), withoutAnchors, withoutTerms}),
              IsEmpty());
  EXPECT_THAT(world.log->entries(), IsEmpty());
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {}), IsEmpty());
}

TEST(AnchorLookup, EmptyListIsLoggedAndTheBookIsNotAskedFor) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {}}}));
  int asked = 0;
  world.owner->onBookWithID = [&] { ++asked; };
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), IsEmpty());
  EXPECT_THAT(world.log->entries(), ElementsAre(Entry{3, "Path array for index: []"}));
  EXPECT_EQ(asked, 0);
}

TEST(AnchorLookup, BookIsAskedForOnceAnIndex) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet"), page("/b.html", "B", "applet")},
                       anchors({{"top", {"/a.html", "/b.html"}}}));
  int asked = 0;
  world.owner->onBookWithID = [&] { ++asked; };
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), SizeIs(2));
  EXPECT_EQ(asked, 1);
}

TEST(AnchorLookup, PathThatTheIndexDoesNotHaveYieldsNothingAndTheOthersStay) {
  const KeywordWorld world;
  const auto index = indexWithAnchors(world, {page("/a.html", "A", "applet")},
                                      anchors({{"top", {"/gone.html", "/a.html"}}}));
  EXPECT_THAT(titlesOf(world.controller->doLookupOfAnchor("top", {index})), ElementsAre("A"));
  EXPECT_THAT(world.log->messages(1), IsEmpty());
}

TEST(AnchorLookup, PageWithoutPropertiesYieldsNothingSilently) {
  const KeywordWorld world;
  Document bare;
  bare.path = "/bare.html";
  bare.body = {"applet"};
  const auto index = indexWithAnchors(world, {bare}, anchors({{"top", {"/bare.html"}}}));
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), IsEmpty());
  EXPECT_THAT(world.log->messages(1), IsEmpty());
}

TEST(AnchorLookup, RecordWithoutAnIndexYieldsNothingSilently) {
  const KeywordWorld world;
  const std::string path =
      world.write("a.helpindex", {{"SKI_ANCHOR_DATA", anchors({{"top", {"/a.html"}}})}});
  const auto index = ZEBHelpindexIndex::initWithPath(path);
  ASSERT_NE(index, nullptr);
  world.log->clear();
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), IsEmpty());
  EXPECT_THAT(world.log->entries(), ElementsAre(Entry{3, R"(Path array for index: ["/a.html"])"},
                                                Entry{3, "parent path: " + world.folder.path()}));
}

TEST(AnchorLookup, DocumentThatCannotBeMadeIsLoggedWithTheWordsOfTheMissingReference) {
  const KeywordWorld world;
  const auto index = indexWithAnchors(world, {page("/a.html", "A", "applet")},
                                      Value::Dictionary{{"top", Value::Array{7, "/a.html"}}});
  EXPECT_THAT(titlesOf(world.controller->doLookupOfAnchor("top", {index})), ElementsAre("A"));
  EXPECT_THAT(world.log->messages(1),
              ElementsAre("No index ref in the index at " + *index->path()));
}

TEST(AnchorLookup, WhatIsNoListCountsAsNone) {
  const KeywordWorld world;
  const auto index = indexWithAnchors(world, {page("/a.html", "A", "applet")},
                                      Value::Dictionary{{"top", "/a.html"}});
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), IsEmpty());
  EXPECT_THAT(world.log->entries(), ElementsAre(Entry{3, "Path array for index: (null)"}));
}

TEST(AnchorLookup, PagesOfAGeneratedIndexLieBesideTheAccessPage) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType1)->setAccessPagePath("/books/manual/index.html");
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {"/a.html"}}}));
  index->setLoadedFromGeneratedCache(true);
  EXPECT_THAT(urlsOf(world.controller->doLookupOfAnchor("top", {index})),
              ElementsAre("file:///books/manual/a.html"));
  EXPECT_THAT(world.log->messages(3), testing::Contains("parent path: /books/manual"));
}

TEST(AnchorLookup, ParentPathThatAlreadyIsAFileURLIsUsedAsItStands) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType1)
      ->setAccessPagePath("file:///books/my manual/index.html");
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {"/a.html"}}}));
  index->setLoadedFromGeneratedCache(true);
  EXPECT_THAT(urlsOf(world.controller->doLookupOfAnchor("top", {index})),
              ElementsAre("file:///books/my%20manual/a.html"));
}

TEST(AnchorLookup, GeneratedIndexWithoutItsBookYieldsNothing) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {"/a.html"}}}));
  index->setLoadedFromGeneratedCache(true);
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), IsEmpty());
  EXPECT_THAT(world.log->messages(3), testing::Contains("parent path: (null)"));
  EXPECT_THAT(world.log->messages(1), IsEmpty());
}

TEST(AnchorLookup, BookThatTheOwnerDoesNotKnowIsLookedUpAsALocalOne) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {"/a.html"}}}));
  EXPECT_THAT(urlsOf(world.controller->doLookupOfAnchor("top", {index})),
              ElementsAre(world.fileURL("book/a.html")));
}

TEST(AnchorLookup, PagesOfARemoteBookHaveTheURLUnderWhichTheServerHasThem) {
  const KeywordWorld world;
  const auto book = world.owner->addBook("book", ZEBHelpBookType4);
  const auto index = indexWithAnchors(world, {page("/my page.html", "A", "applet")},
                                      anchors({{"top", {"/my page.html"}}}));
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), IsEmpty()) << "no URL yet";
  book->setRemoteURL(platform::URL::URLWithString("https://help.example/book/"));
  const auto expected = ZEBHelpBook::_urlForType4HelpBookResult("/my page.html", "book");
  ASSERT_TRUE(expected);
  EXPECT_THAT(urlsOf(world.controller->doLookupOfAnchor("top", {index})),
              ElementsAre(expected->absoluteString()));
}

TEST(AnchorLookup, SpellsTheURLOfAPageAsSearchDoes) {
  const KeywordWorld world;
  const std::string names[] = {"plain",
                               "with blank",
                               "a#b",
                               "100%",
                               "question?",
                               utf8(u8"Gr\u00FC\u00DFe"),
                               "semi;colon:and",
                               "(brackets)[]",
                               "a+b&c=d,e!'*~@$",
                               "back\\slash",
                               utf8(u8"\u65E5\u672C"),
                               "quote\"d",
                               "<angle>"};
  std::vector<Document> pages;
  Value::Dictionary anchorData;
  for (const std::string& name : names) {
    // Each page has an anchor and a word of its own, called alike.
    std::string word = "word";
    word += static_cast<char>('a' + pages.size());
    std::string path = "/sub ";
    path.append(name).append("/").append(name).append(".html");
    pages.push_back(page(path, "Title", word));
    anchorData[word] = Value::Array{path};
  }
  std::vector<std::string> folders(std::begin(names), std::end(names));
  folders.emplace_back("50%25 escaped");
  for (const std::string& folder : folders) {
    const auto index = indexWithAnchors(world, pages, anchorData, folder + "/a.helpindex");
    ASSERT_NE(index, nullptr);
    world.owner->addBook("book", ZEBHelpBookType1)
        ->setAccessPagePath("/books/" + folder + "/index.html");
    for (const bool generated : {false, true}) {
      index->setLoadedFromGeneratedCache(generated);
      for (const auto& [word, paths] : anchorData) {
        const auto found = world.controller->doSearchForString(word, {index}, {});
        const auto lookedUp = world.controller->doLookupOfAnchor(word, {index});
        ASSERT_THAT(found, SizeIs(1)) << folder << " " << word;
        ASSERT_THAT(lookedUp, SizeIs(1)) << folder << " " << word;
        EXPECT_EQ(urlOf(found[0]), urlOf(lookedUp[0]));
        // What a look-up found, a search can be told to leave out.
        EXPECT_THAT(world.controller->doSearchForString(word, {index}, {urlOf(lookedUp[0])}),
                    IsEmpty());
        const auto url = platform::URL::URLWithString(urlOf(found[0]));
        ASSERT_TRUE(url) << urlOf(found[0]);
        EXPECT_TRUE(url->isFileURL());
      }
    }
  }
}

TEST(AnchorLookup, LeavesNoReferenceBehind) {
  const KeywordWorld world;
  const auto index =
      indexWithAnchors(world, {page("/a.html", "A", "applet")}, anchors({{"top", {"/a.html"}}}));
  EXPECT_THAT(world.controller->doLookupOfAnchor("top", {index}), SizeIs(1));
  index->reinitializeWithData(platform::classicArchiveWithRootObject(Value::Dictionary{}));
  EXPECT_EQ(index->copyIndexRef(), nullptr);
}

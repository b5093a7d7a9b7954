// Many threads at one record: the thread sanitizer watches.
#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <thread>

#include "host/Luxwell/HelpLUXIndex.h"
#include "tests/plugin/keyword/KeywordWorld.h"

using platform::Data;
using platform::Value;
using tests::KeywordWorld;
using tests::page;

TEST(Threads, SearchesLookUpsAndChangesOfOneRecordRunSideBySide) {
  const KeywordWorld world;
  world.owner->addBook("book", ZEBHelpBookType1)->setAccessPagePath("/books/manual/index.html");
  Value::Dictionary content = {
      {"SKI_ANCHOR_DATA", tests::anchors({{"top", {"/a.html", "/b.html"}}})},
      {"SKI_USE_REMOTE_ROOT", true},
      {"SKI_REMOTE_ROOT", "https://help.example/book/"},
      {"LUXIndexData", HelpLUXIndex::versionedDataWithAttributes(Value::Dictionary{})}};
  const auto index =
      world.index({page("/a.html", "A", "applet banana"), page("/b.html", "B", "banana")},
                  "book/a.helpindex", content);
  ASSERT_NE(index, nullptr);
  content["SKI_INDEX_DATA"] = tests::keywordIndex({page("/c.html", "C", "applet banana")});
  const Data other = platform::classicArchiveWithRootObject(content);
  const Data array = platform::classicArchiveWithRootObject(Value::Array{});

  std::atomic<bool> stop{false};
  const std::vector<std::function<void()>> readers = {
      [&] {
        for (const auto& result :
             world.controller->doSearchForString("applet banana", {index}, {"file:///x"})) {
          EXPECT_EQ(result->payload().size(), 4U);
        }
      },
      [&] {
        SKIndexRef indexRef = index->copyIndexRef();
        if (indexRef) {
          EXPECT_GE(SKIndexGetMaximumTermID(indexRef), 1);
        }
        index->disposeIndexRef(indexRef);
      },
      [&] {
        index->luxIndex();
        index->luxIndexData();
        index->shouldUseLUXIndex();
      },
      [&] {
        world.controller->doLookupOfAnchor("top", {index});
        index->anchorDictionary();
        index->description();
        index->remoteURL();
        index->setPath(*index->path());
        index->setBookID("book");
      },
  };
  std::vector<std::thread> threads;
  threads.reserve(readers.size());
  for (const auto& reader : readers) {
    threads.emplace_back([&] {
      while (!stop) {
        reader();
      }
    });
  }
  for (int i = 0; i < 60; ++i) {
    EXPECT_TRUE(index->reinitializeWithData(other));
    EXPECT_FALSE(index->reinitializeWithData(i % 2 == 0 ? array : Data::copy("broken")));
    index->setLoadedFromGeneratedCache(i % 2 == 0);
  }
  EXPECT_TRUE(index->reinitializeWithData(other));
  stop = true;
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(world.controller->doSearchForString("applet", {index}, {}).size(), 1U);
}

TEST(Threads, FirstQueriesOfOneControllerMayCoincide) {
  for (int round = 0; round < 50; ++round) {
    const auto controller = ZEBHelpindexSearchController::init();
    std::vector<std::thread> threads;
    threads.reserve(3);
    for (int i = 0; i < 3; ++i) {
      threads.emplace_back(
          [&] { EXPECT_EQ(controller->_prepareQuery("print", {"print"}), "print* "); });
    }
    for (std::thread& thread : threads) {
      thread.join();
    }
  }
}

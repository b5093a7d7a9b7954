#include "zebd/Bookshelf.h"

#include <gmock/gmock.h>

#include <thread>
#include <vector>

#include "host/Zebrine/ZEBHelpBook.h"

namespace {

using zebd::Bookshelf;

std::shared_ptr<ZEBHelpBook> book(const std::string& bookID) {
  return ZEBHelpBook::bookWithID(bookID, 1, "/books/" + bookID);
}

TEST(BookshelfTest, BooksComeAndGoByIdentifier) {
  Bookshelf shelf;
  EXPECT_EQ(shelf.bookWithID("a"), nullptr);
  EXPECT_TRUE(shelf.books().empty());
  const auto first = book("a");
  shelf.addBook(first);
  EXPECT_EQ(shelf.bookWithID("a"), first);
  const auto second = book("a");
  shelf.addBook(second);
  EXPECT_EQ(shelf.bookWithID("a"), second);
  EXPECT_EQ(shelf.books().size(), 1U);
  shelf.removeBook("a");
  shelf.removeBook("a");
  EXPECT_EQ(shelf.bookWithID("a"), nullptr);
}

TEST(BookshelfTest, NullBookIsNone) {
  Bookshelf shelf;
  shelf.addBook(nullptr);
  EXPECT_TRUE(shelf.books().empty());
}

TEST(BookshelfTest, ListIsACopy) {
  Bookshelf shelf;
  shelf.addBook(book("a"));
  Bookshelf::Books books = shelf.books();
  books.clear();
  EXPECT_NE(shelf.bookWithID("a"), nullptr);
}

TEST(BookshelfTest, ManyThreadsMayChangeAndReadIt) {
  Bookshelf shelf;
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&shelf, thread] {
      for (int i = 0; i < 200; ++i) {
        const std::string bookID = "book" + std::to_string(thread) + "-" + std::to_string(i);
        shelf.addBook(book(bookID));
        EXPECT_NE(shelf.bookWithID(bookID), nullptr);
        if (i % 2 == 1) {
          shelf.removeBook(bookID);
        }
        (void)shelf.books();
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(shelf.books().size(), 400U);
}

}  // namespace

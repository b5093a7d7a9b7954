// Real help pages as extracted text, kept in one file so that they are extracted once.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "SearchKit/IndexWriter.h"

namespace engines {

/// A manual, or a part of one: pages with everything that an index takes.
struct Book {
  std::string name;
  std::vector<searchkit::Document> pages;

  /// Bytes of titles, headings and running text.
  size_t textLength() const;
};

using Books = std::vector<Book>;

size_t pageCount(const Books& books);
size_t textLength(const Books& books);

/// The same pages, in their order, cut into `count` books of equally many.
Books split(const Books& books, size_t count);

/// Throws std::runtime_error when the file cannot be written.
void writeBooks(const Books& books, const std::string& path);

/// Throws std::runtime_error when the file cannot be read or is no such file.
Books readBooks(const std::string& path);

}  // namespace engines

// What every engine has to do here.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "bench/engines/Corpus.h"

namespace engines {

/// Terms that must all match (or any), as they are or as the beginnings of terms.
struct Question {
  std::vector<std::string> terms;
  bool isPrefix = false;
  bool isAny = false;

  std::string text() const;
};

struct Found {
  uint32_t book = 0;
  uint32_t page = 0;
  float score = 0;
};

/// One index a book, each in memory as the bytes of a file. Pages are numbered within their book in
/// the order of their paths. Thread-safety: confined to one thread.
class Engine {
 public:
  virtual ~Engine() = default;

  virtual const char* name() const = 0;

  /// All pages of all books that match, with scores; in any order. Replaces what was in `found`.
  virtual void search(const Question& question, std::vector<Found>& found) = 0;

  /// As search(), but the best 500 of a book suffice.
  virtual void searchForTiming(const Question& question, std::vector<Found>& found) {
    search(question, found);
  }

  /// Reads path, title and abstract of what was found; returns how many bytes they have.
  virtual size_t readRecords(const std::vector<Found>& found) = 0;
};

/// Bytes of a file that stay where they are as long as anybody needs them.
struct Image {
  const uint8_t* bytes = nullptr;
  size_t length = 0;
  /// Where the bytes came from; 0 where the file is not open.
  int file = -1;
};
using Images = std::vector<Image>;

/// Maps the files of a folder, in the order of their names. They stay mapped, and open, to the end
/// of the process. Throws std::runtime_error.
Images mapFolder(const std::string& folder);
size_t totalLength(const Images& images);
/// The name in a folder of the n-th book's file.
std::string imagePath(const std::string& folder, size_t book);
void writeImage(const std::string& folder, size_t book, const void* bytes, size_t length);

// Each engine: makes its files of books in a folder, and opens them.

void buildKeywordIndexes(const Books& books, const std::string& folder);
std::unique_ptr<Engine> openKeywordEngine(const Images& images);
/// Opens and closes each once more.
void reopenKeywordIndexes(const Images& images);
/// The bytes of all indexes without their positions.
size_t lengthWithoutPositions(const Images& images);

struct SQLiteOptions {
  /// The lengths of prefixes with an index of their own; null for none.
  const char* prefixes = nullptr;
};
void buildSQLiteImages(const Books& books, const std::string& folder, SQLiteOptions options);
std::unique_ptr<Engine> openSQLiteEngine(const Images& images, const char* name);
void reopenSQLiteImages(const Images& images);

void buildXapianFiles(const Books& books, const std::string& folder);
/// One database of all books, or one after the other.
std::unique_ptr<Engine> openXapianEngine(const Images& images, bool isJoined);
void reopenXapianFiles(const Images& images);

/// The words of a page as the keyword engine's own tokenizer finds them, each with a blank after
/// it: what the peers index.
struct PageWords {
  std::string title;
  std::string headings;
  std::string body;
};
PageWords wordsOfPage(const searchkit::Document& page);

// Building in memory, for its time alone.

size_t buildKeywordIndexInMemory(const Book& book);
/// With FTS5's own tokenizer, and of words that were split before.
size_t buildSQLiteInMemory(const Book& book);
size_t buildSQLiteInMemory(const std::vector<PageWords>& pages);

}  // namespace engines

// Xapian: a compacted single-file database a book, on a file in memory, with its own default
// weighting (BM25). The words of a prefix count as one (OP_SYNONYM), as they do here.
#include <sys/mman.h>
#include <unistd.h>
#include <xapian.h>

#include <algorithm>
#include <filesystem>
#include <sstream>
#include <stdexcept>

#include "bench/engines/Engine.h"

namespace engines {

namespace {

namespace fs = std::filesystem;

constexpr size_t longestTerm = 245;
constexpr Xapian::doccount pagesKeptOfABook = 500;

int memoryFile(const Image& image) {
  const int file = memfd_create("book", 0);
  if (file < 0 || write(file, image.bytes, image.length) != static_cast<ssize_t>(image.length)) {
    throw std::runtime_error("no file in memory");
  }
  lseek(file, 0, SEEK_SET);
  return file;
}

void addWords(Xapian::Document& document, const std::string& words, Xapian::termcount weight,
              Xapian::termpos& position) {
  std::istringstream stream(words);
  for (std::string term; stream >> term;) {
    term.resize(std::min(term.size(), longestTerm));
    document.add_posting(term, ++position, weight);
  }
  position += 100;
}

void fill(Xapian::WritableDatabase& database, const Book& book) {
  for (const searchkit::Document& page : book.pages) {
    const PageWords words = wordsOfPage(page);
    Xapian::Document document;
    Xapian::termpos position = 0;
    addWords(document, words.title, 10, position);
    addWords(document, words.headings, 3, position);
    addWords(document, words.body, 1, position);
    document.set_data(page.path + '\n' + page.title.value_or("") + '\n' +
                      page.abstract.value_or(""));
    database.add_document(document);
  }
}

class XapianEngine : public Engine {
 public:
  XapianEngine(const Images& images, bool isJoined) : _isJoined(isJoined) {
    Xapian::Database all;
    for (const Image& image : images) {
      const Xapian::Database database(memoryFile(image));
      if (isJoined) {
        all.add_database(database);
      } else {
        _databases.push_back(database);
      }
    }
    _bookCount = images.size();
    if (isJoined) {
      _databases.push_back(all);
    }
  }

  const char* name() const override { return _isJoined ? "Xapian" : "Xapian, book by book"; }

  void search(const Question& question, std::vector<Found>& found) override {
    _search(question, found, [](const Xapian::Database& books) { return books.get_doccount(); });
  }

  void searchForTiming(const Question& question, std::vector<Found>& found) override {
    _search(question, found, [](const Xapian::Database&) { return pagesKeptOfABook; });
  }

  size_t readRecords(const std::vector<Found>& found) override {
    size_t length = 0;
    for (const Found& one : found) {
      if (_isJoined) {
        length += _databases[0]
                      .get_document(one.page * static_cast<uint32_t>(_bookCount) + one.book + 1)
                      .get_data()
                      .size();
      } else {
        length += _databases[one.book].get_document(one.page + 1).get_data().size();
      }
    }
    return length;
  }

 private:
  template <typename Limit>
  void _search(const Question& question, std::vector<Found>& found, const Limit& limit) {
    found.clear();
    std::vector<Xapian::Query> terms;
    for (const std::string& term : question.terms) {
      terms.push_back(question.isPrefix ? Xapian::Query(Xapian::Query::OP_WILDCARD, term, 0,
                                                        Xapian::Query::WILDCARD_LIMIT_ERROR,
                                                        Xapian::Query::OP_SYNONYM)
                                        : Xapian::Query(term));
    }
    const Xapian::Query query(question.isAny ? Xapian::Query::OP_OR : Xapian::Query::OP_AND,
                              terms.begin(), terms.end());
    for (uint32_t i = 0; i < _databases.size(); ++i) {
      Xapian::Enquire enquire(_databases[i]);
      enquire.set_query(query);
      const Xapian::MSet matches = enquire.get_mset(0, limit(_databases[i]));
      for (auto match = matches.begin(); match != matches.end(); ++match) {
        const auto number = static_cast<uint32_t>(*match - 1);
        const auto score = static_cast<float>(match.get_weight());
        if (_isJoined) {
          const auto count = static_cast<uint32_t>(_bookCount);
          found.push_back({number % count, number / count, score});
        } else {
          found.push_back({i, number, score});
        }
      }
    }
  }

  bool _isJoined;
  size_t _bookCount = 0;
  std::vector<Xapian::Database> _databases;
};

}  // namespace

void buildXapianFiles(const Books& books, const std::string& folder) {
  fs::create_directories(folder);
  const std::string work = folder + "/work";
  for (size_t book = 0; book < books.size(); ++book) {
    fs::remove_all(work);
    Xapian::WritableDatabase database(
        work, Xapian::DB_CREATE_OR_OVERWRITE | Xapian::DB_BACKEND_GLASS | Xapian::DB_NO_SYNC);
    fill(database, books[book]);
    database.commit();
    database.compact(imagePath(folder, book), Xapian::DBCOMPACT_SINGLE_FILE);
  }
  fs::remove_all(work);
}

std::unique_ptr<Engine> openXapianEngine(const Images& images, bool isJoined) {
  return std::make_unique<XapianEngine>(images, isJoined);
}

void reopenXapianFiles(const Images& images) {
  for (const Image& image : images) {
    const int file = dup(image.file);
    lseek(file, 0, SEEK_SET);
    const Xapian::Database database(file);
  }
}

}  // namespace engines

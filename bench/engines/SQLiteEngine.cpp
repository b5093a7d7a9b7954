// SQLite FTS5: a read-only database image a book. As fast as it could be made: one segment
// ("optimize"), single-threaded, prepared statements, one read transaction that stays open, no
// order asked for (hits come as they are found, each with its rank), and its own small table for
// records.
#include <sqlite3.h>

#include <stdexcept>

#include "bench/engines/Engine.h"

namespace engines {

namespace {

void check(sqlite3* database, int status) {
  if (status != SQLITE_OK && status != SQLITE_DONE && status != SQLITE_ROW) {
    throw std::runtime_error(std::string("SQLite: ") + sqlite3_errmsg(database));
  }
}

// A tokenizer that takes what lies between blanks as it is.
int splitAtBlanks(Fts5Tokenizer* /*tokenizer*/, void* context, int /*flags*/, const char* text,
                  int length, int (*token)(void*, int, const char*, int, int, int)) {
  int begin = 0;
  for (int at = 0; at <= length; ++at) {
    if (at < length && text[at] != ' ') {
      continue;
    }
    if (at > begin) {
      const int status = token(context, 0, text + begin, at - begin, begin, at);
      if (status != SQLITE_OK) {
        return status;
      }
    }
    begin = at + 1;
  }
  return SQLITE_OK;
}

class Statement {
 public:
  Statement(sqlite3* database, const char* text) : _database(database) {
    check(database,
          sqlite3_prepare_v3(database, text, -1, SQLITE_PREPARE_PERSISTENT, &_statement, nullptr));
  }
  Statement(const Statement&) = delete;
  Statement& operator=(const Statement&) = delete;
  ~Statement() { sqlite3_finalize(_statement); }

  void bind(int parameter, const std::string& text) {
    sqlite3_bind_text(_statement, parameter, text.data(), static_cast<int>(text.size()), nullptr);
  }
  void bind(int parameter, int64_t number) { sqlite3_bind_int64(_statement, parameter, number); }
  bool step() {
    const int status = sqlite3_step(_statement);
    check(_database, status);
    return status == SQLITE_ROW;
  }
  sqlite3_stmt* raw() const { return _statement; }
  void reset() { check(_database, sqlite3_reset(_statement)); }
  int64_t number(int column) const { return sqlite3_column_int64(_statement, column); }
  double real(int column) const { return sqlite3_column_double(_statement, column); }
  size_t textLength(int column) const {
    sqlite3_column_text(_statement, column);
    return static_cast<size_t>(sqlite3_column_bytes(_statement, column));
  }

 private:
  sqlite3* _database;
  sqlite3_stmt* _statement = nullptr;
};

class Database {
 public:
  Database() {
    static const int configured = [] {
      sqlite3_config(SQLITE_CONFIG_SINGLETHREAD);
      return sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0);
    }();
    check(nullptr, configured);
    check(_database, sqlite3_open_v2(":memory:", &_database,
                                     SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr));
    fts5_api* api = nullptr;
    Statement select(_database, "SELECT fts5(?1)");
    sqlite3_bind_pointer(select.raw(), 1, static_cast<void*>(&api), "fts5_api_ptr", nullptr);
    select.step();
    fts5_tokenizer words = {[](void*, const char**, int, Fts5Tokenizer** made) {
                              static int nothing;
                              *made = reinterpret_cast<Fts5Tokenizer*>(&nothing);
                              return SQLITE_OK;
                            },
                            [](Fts5Tokenizer*) {}, splitAtBlanks};
    check(_database, api->xCreateTokenizer(api, "words", nullptr, &words, nullptr));
  }
  Database(const Database&) = delete;
  Database& operator=(const Database&) = delete;
  ~Database() { sqlite3_close(_database); }

  void openImage(const Image& image) {
    check(_database, sqlite3_deserialize(_database, "main", const_cast<uint8_t*>(image.bytes),
                                         static_cast<sqlite3_int64>(image.length),
                                         static_cast<sqlite3_int64>(image.length),
                                         SQLITE_DESERIALIZE_READONLY));
    run("BEGIN");
  }

  void run(const std::string& text) {
    check(_database, sqlite3_exec(_database, text.c_str(), nullptr, nullptr, nullptr));
  }
  sqlite3* raw() const { return _database; }

 private:
  sqlite3* _database = nullptr;
};

void createTables(Database& database, const char* tokenizer, const char* prefixes) {
  database.run("PRAGMA page_size = 4096");
  database.run("PRAGMA synchronous = OFF");
  database.run("CREATE TABLE records(id INTEGER PRIMARY KEY, path, title, abstract)");
  database.run(std::string("CREATE VIRTUAL TABLE pages USING fts5(title, headings, body, "
                           "content='', tokenize='") +
               tokenizer + "'" +
               (prefixes != nullptr ? std::string(", prefix='") + prefixes + "'" : "") + ")");
  database.run("INSERT INTO pages(pages, rank) VALUES('rank', 'bm25(10.0, 3.0, 1.0)')");
  // Everything is sorted in memory once.
  database.run("INSERT INTO pages(pages, rank) VALUES('hashsize', 1073741824)");
  database.run("BEGIN");
}

constexpr const char* insertPage =
    "INSERT INTO pages(rowid, title, headings, body) VALUES(?1, ?2, ?3, ?4)";

void addPage(Statement& insert, size_t number, const PageWords& words) {
  insert.bind(1, static_cast<int64_t>(number + 1));
  insert.bind(2, words.title);
  insert.bind(3, words.headings);
  insert.bind(4, words.body);
  insert.step();
  insert.reset();
}

std::string joined(const std::vector<std::string>& texts) {
  std::string all;
  for (const std::string& text : texts) {
    all += text;
    all += '\n';
  }
  return all;
}

// An opened book with its statements.
struct OpenBook {
  explicit OpenBook(const Image& image) { database.openImage(image); }

  Database database;
  std::unique_ptr<Statement> select;
  std::unique_ptr<Statement> record;
};

class SQLiteEngine : public Engine {
 public:
  SQLiteEngine(const Images& images, const char* name) : _name(name) {
    for (const Image& image : images) {
      auto book = std::make_unique<OpenBook>(image);
      book->select = std::make_unique<Statement>(
          book->database.raw(), "SELECT rowid, rank FROM pages WHERE pages MATCH ?1");
      book->record = std::make_unique<Statement>(
          book->database.raw(), "SELECT path, title, abstract FROM records WHERE id = ?1");
      _books.push_back(std::move(book));
    }
  }

  const char* name() const override { return _name; }

  void search(const Question& question, std::vector<Found>& found) override {
    found.clear();
    std::string expression;
    for (const std::string& term : question.terms) {
      expression += expression.empty() ? "\"" : question.isAny ? " OR \"" : " AND \"";
      expression += term;
      expression += question.isPrefix ? "\" *" : "\"";
    }
    for (uint32_t book = 0; book < _books.size(); ++book) {
      Statement& select = *_books[book]->select;
      select.bind(1, expression);
      while (select.step()) {
        found.push_back({book, static_cast<uint32_t>(select.number(0) - 1),
                         static_cast<float>(-select.real(1))});
      }
      select.reset();
    }
  }

  size_t readRecords(const std::vector<Found>& found) override {
    size_t length = 0;
    for (const Found& one : found) {
      Statement& record = *_books[one.book]->record;
      record.bind(1, int64_t{one.page} + 1);
      record.step();
      length += record.textLength(0) + record.textLength(1) + record.textLength(2);
      record.reset();
    }
    return length;
  }

 private:
  const char* _name;
  std::vector<std::unique_ptr<OpenBook>> _books;
};

}  // namespace

void buildSQLiteImages(const Books& books, const std::string& folder, SQLiteOptions options) {
  for (size_t book = 0; book < books.size(); ++book) {
    Database database;
    createTables(database, "words", options.prefixes);
    {
      Statement insert(database.raw(), insertPage);
      Statement record(database.raw(),
                       "INSERT INTO records(id, path, title, abstract) VALUES(?1, ?2, ?3, ?4)");
      for (size_t i = 0; i < books[book].pages.size(); ++i) {
        const searchkit::Document& page = books[book].pages[i];
        addPage(insert, i, wordsOfPage(page));
        record.bind(1, static_cast<int64_t>(i + 1));
        record.bind(2, page.path);
        const std::string title = page.title.value_or("");
        record.bind(3, title);
        const std::string abstract = page.abstract.value_or("");
        record.bind(4, abstract);
        record.step();
        record.reset();
      }
    }
    database.run("COMMIT");
    database.run("INSERT INTO pages(pages) VALUES('optimize')");
    database.run("VACUUM");
    sqlite3_int64 length = 0;
    unsigned char* const bytes = sqlite3_serialize(database.raw(), "main", &length, 0);
    writeImage(folder, book, bytes, static_cast<size_t>(length));
    sqlite3_free(bytes);
  }
}

std::unique_ptr<Engine> openSQLiteEngine(const Images& images, const char* name) {
  return std::make_unique<SQLiteEngine>(images, name);
}

void reopenSQLiteImages(const Images& images) {
  for (const Image& image : images) {
    const OpenBook book(image);
  }
}

size_t buildSQLiteInMemory(const Book& book) {
  Database database;
  createTables(database, "unicode61", nullptr);
  {
    Statement insert(database.raw(), insertPage);
    for (size_t i = 0; i < book.pages.size(); ++i) {
      const searchkit::Document& page = book.pages[i];
      addPage(insert, i, {page.title.value_or(""), joined(page.headings), joined(page.body)});
    }
  }
  database.run("COMMIT");
  return book.pages.size();
}

size_t buildSQLiteInMemory(const std::vector<PageWords>& pages) {
  Database database;
  createTables(database, "words", nullptr);
  {
    Statement insert(database.raw(), insertPage);
    for (size_t i = 0; i < pages.size(); ++i) {
      addPage(insert, i, pages[i]);
    }
  }
  database.run("COMMIT");
  return pages.size();
}

}  // namespace engines

#include "bench/Luxwell/SpeedPeers.h"

#include <sqlite3.h>
#include <xapian.h>

#include <stdexcept>
#include <vector>

namespace quality {

namespace {

constexpr int hitCount = 50;

class XapianSpeedPeer : public SpeedPeer {
 public:
  XapianSpeedPeer(const Collection& pages, const std::filesystem::path& folder) {
    _generator.set_stemmer(Xapian::Stem("en"));
    _generator.set_stemming_strategy(Xapian::TermGenerator::STEM_ALL);
    {
      Xapian::WritableDatabase database((folder / "xapian").string(),
                                        Xapian::DB_CREATE_OR_OVERWRITE);
      for (const Document& page : pages.documents) {
        Xapian::Document entry;
        _generator.set_document(entry);
        _generator.index_text_without_positions(page.title);
        _generator.index_text_without_positions(page.text());
        database.add_document(entry);
      }
      database.commit();
    }
    _database = Xapian::Database((folder / "xapian").string());
  }

  size_t search(const std::string& text) override {
    Xapian::Document words;
    _generator.set_document(words);
    _generator.index_text_without_positions(text);
    std::vector<Xapian::Query> terms;
    for (auto term = words.termlist_begin(); term != words.termlist_end(); ++term) {
      terms.emplace_back(*term, term.get_wdf());
    }
    return _find(Xapian::Query(Xapian::Query::OP_OR, terms.begin(), terms.end()));
  }

  size_t complete(const std::string& prefix) override {
    // What its query parser makes of an unfinished word.
    return _find(Xapian::Query(Xapian::Query::OP_WILDCARD, prefix, 100,
                               Xapian::Query::WILDCARD_LIMIT_MOST_FREQUENT,
                               Xapian::Query::OP_SYNONYM));
  }

 private:
  size_t _find(const Xapian::Query& query) {
    Xapian::Enquire enquire(_database);
    enquire.set_query(query);
    return enquire.get_mset(0, hitCount).size();
  }

  Xapian::Database _database;
  Xapian::TermGenerator _generator;
};

class SQLiteSpeedPeer : public SpeedPeer {
 public:
  SQLiteSpeedPeer(const Collection& pages, const std::filesystem::path& folder) {
    _check(sqlite3_open((folder / "pages.sqlite").c_str(), &_database));
    _check(sqlite3_exec(_database,
                        "CREATE VIRTUAL TABLE pages USING fts5(title, body, "
                        "tokenize='porter unicode61', prefix='3 4'); BEGIN",
                        nullptr, nullptr, nullptr));
    sqlite3_stmt* insert = _prepare("INSERT INTO pages(title, body) VALUES(?1, ?2)");
    for (const Document& page : pages.documents) {
      const std::string text = page.text();
      _bind(insert, 1, page.title);
      _bind(insert, 2, text);
      sqlite3_step(insert);
      _check(sqlite3_reset(insert));
    }
    sqlite3_finalize(insert);
    _check(sqlite3_exec(_database, "COMMIT; INSERT INTO pages(pages) VALUES('optimize')", nullptr,
                        nullptr, nullptr));
    _select = _prepare(
        "SELECT rowid FROM pages WHERE pages MATCH ?1 ORDER BY bm25(pages, 4.0, 1.0) LIMIT 50");
  }
  SQLiteSpeedPeer(const SQLiteSpeedPeer&) = delete;
  SQLiteSpeedPeer& operator=(const SQLiteSpeedPeer&) = delete;
  ~SQLiteSpeedPeer() override {
    sqlite3_finalize(_select);
    sqlite3_close(_database);
  }

  size_t search(const std::string& text) override {
    std::string expression;
    std::string word;
    for (const char c : text + " ") {
      const bool isLetter = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
                            (c >= '0' && c <= '9') || (c & 0x80) != 0;
      if (isLetter) {
        word += c;
      } else if (!word.empty()) {
        expression += (expression.empty() ? "\"" : " OR \"") + word + "\"";
        word.clear();
      }
    }
    return expression.empty() ? 0 : _find(expression);
  }

  size_t complete(const std::string& prefix) override { return _find("\"" + prefix + "\" *"); }

 private:
  size_t _find(const std::string& expression) {
    _bind(_select, 1, expression);
    size_t count = 0;
    while (sqlite3_step(_select) == SQLITE_ROW) {
      ++count;
    }
    _check(sqlite3_reset(_select));
    return count;
  }
  void _check(int status) {
    if (status != SQLITE_OK) {
      throw std::runtime_error(std::string("SQLite: ") + sqlite3_errmsg(_database));
    }
  }
  sqlite3_stmt* _prepare(const char* text) {
    sqlite3_stmt* statement = nullptr;
    _check(sqlite3_prepare_v2(_database, text, -1, &statement, nullptr));
    return statement;
  }
  static void _bind(sqlite3_stmt* statement, int index, const std::string& text) {
    sqlite3_bind_text(statement, index, text.data(), static_cast<int>(text.size()), nullptr);
  }

  sqlite3* _database = nullptr;
  sqlite3_stmt* _select = nullptr;
};

}  // namespace

std::unique_ptr<SpeedPeer> xapianSpeedPeer(const Collection& pages,
                                           const std::filesystem::path& folder) {
  return std::make_unique<XapianSpeedPeer>(pages, folder);
}

std::unique_ptr<SpeedPeer> sqliteSpeedPeer(const Collection& pages,
                                           const std::filesystem::path& folder) {
  return std::make_unique<SQLiteSpeedPeer>(pages, folder);
}

}  // namespace quality

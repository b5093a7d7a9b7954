#include "bench/quality/Peers.h"

#include <sqlite3.h>
#include <xapian.h>

#include <stdexcept>

namespace quality {

namespace {

class XapianEngine : public Engine {
 public:
  XapianEngine(const Collection& collection, unsigned titleWeight)
      : _database(std::string(), Xapian::DB_BACKEND_INMEMORY) {
    try {
      _generator.set_stemmer(Xapian::Stem(collection.language.substr(0, 2)));
      _generator.set_stemming_strategy(Xapian::TermGenerator::STEM_ALL);
    } catch (const Xapian::InvalidArgumentError&) {
      // No stemmer for this language: words as they are. Words of scripts that write no blanks are
      // cut into pairs of characters.
      _generator.set_flags(Xapian::TermGenerator::FLAG_CJK_NGRAM);
    }
    for (const Document& document : collection.documents) {
      Xapian::Document entry;
      _generator.set_document(entry);
      _generator.index_text_without_positions(document.title, titleWeight);
      _generator.index_text_without_positions(document.text());
      _database.add_document(entry);
    }
  }

  Ranking search(const std::string& query, size_t count) override {
    Xapian::Document words;
    _generator.set_document(words);
    _generator.index_text_without_positions(query);
    std::vector<Xapian::Query> terms;
    for (auto term = words.termlist_begin(); term != words.termlist_end(); ++term) {
      terms.emplace_back(*term, term.get_wdf());
    }
    Xapian::Enquire enquire(_database);
    enquire.set_query(Xapian::Query(Xapian::Query::OP_OR, terms.begin(), terms.end()));
    const Xapian::MSet matches = enquire.get_mset(0, static_cast<Xapian::doccount>(count));
    Ranking ranking;
    for (auto match = matches.begin(); match != matches.end(); ++match) {
      ranking.push_back(*match - 1);
    }
    return ranking;
  }

 private:
  Xapian::WritableDatabase _database;
  Xapian::TermGenerator _generator;
};

class SQLiteEngine : public Engine {
 public:
  explicit SQLiteEngine(const Collection& collection) {
    _check(sqlite3_open(":memory:", &_database));
    _run("CREATE VIRTUAL TABLE pages USING fts5(title, body, tokenize='porter unicode61')");
    _run("CREATE VIRTUAL TABLE words USING fts5(text, tokenize='unicode61')");
    _run("CREATE VIRTUAL TABLE vocabulary USING fts5vocab(words, instance)");
    _run("BEGIN");
    sqlite3_stmt* insert = _prepare("INSERT INTO pages(rowid, title, body) VALUES(?1, ?2, ?3)");
    for (size_t i = 0; i < collection.documents.size(); ++i) {
      const std::string text = collection.documents[i].text();
      sqlite3_bind_int64(insert, 1, static_cast<sqlite3_int64>(i));
      _bind(insert, 2, collection.documents[i].title);
      _bind(insert, 3, text);
      sqlite3_step(insert);
      _check(sqlite3_reset(insert));
    }
    sqlite3_finalize(insert);
    _run("COMMIT");
    _select = _prepare(
        "SELECT rowid FROM pages WHERE pages MATCH ?1 ORDER BY bm25(pages, 4.0, 1.0) LIMIT ?2");
    _keepWords = _prepare("INSERT INTO words(rowid, text) VALUES(1, ?1)");
    _readWords = _prepare("SELECT DISTINCT term FROM vocabulary");
  }
  SQLiteEngine(const SQLiteEngine&) = delete;
  SQLiteEngine& operator=(const SQLiteEngine&) = delete;
  ~SQLiteEngine() override {
    sqlite3_finalize(_select);
    sqlite3_finalize(_keepWords);
    sqlite3_finalize(_readWords);
    sqlite3_close(_database);
  }

  Ranking search(const std::string& query, size_t count) override {
    // Its own tokenizer finds the words of the query, so that punctuation means nothing.
    _run("DELETE FROM words");
    _bind(_keepWords, 1, query);
    sqlite3_step(_keepWords);
    _check(sqlite3_reset(_keepWords));
    std::string expression;
    while (sqlite3_step(_readWords) == SQLITE_ROW) {
      const auto* word = reinterpret_cast<const char*>(sqlite3_column_text(_readWords, 0));
      expression += (expression.empty() ? "\"" : " OR \"") + std::string(word) + "\"";
    }
    _check(sqlite3_reset(_readWords));
    Ranking ranking;
    if (expression.empty()) {
      return ranking;
    }
    _bind(_select, 1, expression);
    sqlite3_bind_int64(_select, 2, static_cast<sqlite3_int64>(count));
    while (sqlite3_step(_select) == SQLITE_ROW) {
      ranking.push_back(static_cast<size_t>(sqlite3_column_int64(_select, 0)));
    }
    _check(sqlite3_reset(_select));
    return ranking;
  }

 private:
  void _check(int status) {
    if (status != SQLITE_OK) {
      throw std::runtime_error(std::string("SQLite: ") + sqlite3_errmsg(_database));
    }
  }
  void _run(const char* statement) {
    _check(sqlite3_exec(_database, statement, nullptr, nullptr, nullptr));
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
  sqlite3_stmt* _keepWords = nullptr;
  sqlite3_stmt* _readWords = nullptr;
};

}  // namespace

std::unique_ptr<Engine> xapianEngine(const Collection& collection, unsigned titleWeight) {
  return std::make_unique<XapianEngine>(collection, titleWeight);
}

std::unique_ptr<Engine> sqliteEngine(const Collection& collection) {
  return std::make_unique<SQLiteEngine>(collection);
}

}  // namespace quality

// A test collection: documents, queries, and which documents answer which query.
#pragma once

#include <cstddef>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace quality {

struct Document {
  std::string id;
  std::string title;
  /// Paragraphs, headings among them; a collection that is read from a folder has one a document.
  std::vector<std::string> blocks;

  /// All blocks, joined by one blank.
  std::string text() const;
};

struct Query {
  std::string id;
  std::string text;
};

struct Collection {
  std::string name;
  /// Tag of the language that documents and queries are written in.
  std::string language = "en";
  /// Where it comes from, with versions; empty when nobody knows.
  std::string origin;
  std::vector<Document> documents;
  std::vector<Query> queries;
  /// Query identifier to document number to grade, grades above 0 only.
  std::map<std::string, std::map<size_t, int>> answers;
};

/// Reads a folder with `docs.tsv` (identifier, title, text), `queries.tsv` (identifier, text) and
/// `qrels.tsv` (query identifier, document identifier, grade). An optional file `language` holds a
/// language tag. Judgements of documents or queries that are not there are left out, and so are
/// queries without an answer. Throws std::runtime_error when a file cannot be read.
Collection readCollection(const std::filesystem::path& folder);

/// The collections of several folders, each of which is one or holds some. Throws
/// std::runtime_error when a folder holds none, or one that cannot be read.
std::vector<Collection> collectionsInFolders(const std::vector<std::string>& folders);

/// Writes the folder that readCollection() reads. Blocks become one text.
void writeCollection(const Collection& collection, const std::filesystem::path& folder);

/// Writes one HTML page a document, for the indexing tool; nothing of a page but its title and its
/// blocks. The page of document n is bookPageName(n).
void writeBook(const Collection& collection, const std::filesystem::path& folder);
std::string bookPageName(size_t document);
/// The number back from the name; the collection's size or more where it is no such name.
size_t documentOfBookPageName(std::string_view name);

/// The same everywhere and for ever: what queries are chosen by (FNV-1a, 64 bits).
uint64_t stableHash(std::string_view text) noexcept;

}  // namespace quality

// Small indexes and searches for tests.
#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "SearchKit/IndexReader.h"
#include "SearchKit/IndexWriter.h"
#include "SearchKit/SearchKit.h"

namespace searchkit::testing {

inline Document page(std::string path, std::string body) {
  Document document;
  document.path = std::move(path);
  document.title = "";
  document.body.push_back(std::move(body));
  return document;
}

inline platform::Data indexData(const std::vector<Document>& documents,
                                size_t minimumTermLength = 1) {
  IndexWriter writer({minimumTermLength});
  for (const Document& document : documents) {
    writer.add(document);
  }
  return writer.finish();
}

inline SKIndexRef openIndex(const std::vector<Document>& documents, size_t minimumTermLength = 1) {
  return SKIndexOpenWithData(indexData(documents, minimumTermLength));
}

/// All hits of a search with their scores, by document number.
inline std::map<SKDocumentID, float> scores(const SKIndexRef& index, std::string_view query,
                                            SKSearchOptions options = kSKSearchOptionDefault) {
  std::map<SKDocumentID, float> hits;
  const SKSearchRef search = SKSearchCreate(index, query, options);
  bool mayHaveMore = search != nullptr;
  while (mayHaveMore) {
    SKDocumentID ids[7];
    float values[7];
    size_t count = 0;
    mayHaveMore = SKSearchFindMatches(*search, 7, ids, values, 1.0, &count);
    for (size_t i = 0; i < count; ++i) {
      hits.emplace(ids[i], values[i]);
    }
  }
  return hits;
}

/// The paths of all hits, in order of the paths, with a blank after each.
inline std::string found(const SKIndexRef& index, std::string_view query,
                         SKSearchOptions options = kSKSearchOptionDefault) {
  std::string paths;
  for (const auto& [id, score] : scores(index, query, options)) {
    const auto document = indexDocument(*index, id);
    paths += document ? std::string(document->path) : "?";
    paths += ' ';
  }
  return paths;
}

/// The query that a search for plain words makes: each distinct term with a star and a blank.
inline std::string composed(const SKIndexRef& index, std::string_view words) {
  std::string query;
  for (const std::string& term : SKIndexCopyUniqueTerms(index, words)) {
    query += term + "* ";
  }
  return query;
}

}  // namespace searchkit::testing

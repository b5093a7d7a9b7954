#include "bench/quality/Collection.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstdio>
#include <fstream>
#include <stdexcept>
#include <unordered_map>

namespace quality {

namespace {

std::vector<std::string> fieldsOfLine(const std::string& line, size_t count) {
  std::vector<std::string> fields;
  size_t start = 0;
  while (fields.size() + 1 < count) {
    const size_t tab = line.find('\t', start);
    if (tab == std::string::npos) {
      break;
    }
    fields.push_back(line.substr(start, tab - start));
    start = tab + 1;
  }
  fields.push_back(line.substr(start));
  fields.resize(count);
  return fields;
}

template <typename Body>
void forEachLine(const std::filesystem::path& file, size_t fieldCount, const Body& body) {
  std::ifstream stream(file);
  if (!stream) {
    throw std::runtime_error("cannot read " + file.string());
  }
  for (std::string line; std::getline(stream, line);) {
    if (!line.empty() && line.back() == '\r') {
      line.pop_back();
    }
    if (!line.empty()) {
      body(fieldsOfLine(line, fieldCount));
    }
  }
}

std::string oneLine(std::string text) {
  for (char& c : text) {
    if (c == '\t' || c == '\n' || c == '\r') {
      c = ' ';
    }
  }
  return text;
}

std::string escaped(const std::string& text) {
  std::string result;
  for (const char c : text) {
    switch (c) {
      case '&':
        result += "&amp;";
        break;
      case '<':
        result += "&lt;";
        break;
      case '>':
        result += "&gt;";
        break;
      default:
        result += c;
    }
  }
  return result;
}

std::ofstream openForWriting(const std::filesystem::path& file) {
  std::ofstream stream(file, std::ios::binary | std::ios::trunc);
  if (!stream) {
    throw std::runtime_error("cannot write " + file.string());
  }
  return stream;
}

}  // namespace

std::string Document::text() const {
  std::string result;
  for (const std::string& block : blocks) {
    if (!result.empty()) {
      result += ' ';
    }
    result += block;
  }
  return result;
}

Collection readCollection(const std::filesystem::path& folder) {
  Collection collection;
  collection.name = std::filesystem::absolute(folder / "x").parent_path().filename().string();
  if (std::ifstream stream(folder / "language"); stream) {
    std::string tag;
    stream >> tag;
    if (!tag.empty()) {
      collection.language = tag;
    }
  }
  if (std::ifstream stream(folder / "origin"); stream) {
    std::getline(stream, collection.origin);
  }
  std::unordered_map<std::string, size_t> numbers;
  forEachLine(folder / "docs.tsv", 3, [&](const std::vector<std::string>& fields) {
    if (numbers.emplace(fields[0], collection.documents.size()).second) {
      collection.documents.push_back({fields[0], fields[1], {fields[2]}});
    }
  });
  forEachLine(folder / "qrels.tsv", 3, [&](const std::vector<std::string>& fields) {
    int grade = 0;
    std::from_chars(fields[2].data(), fields[2].data() + fields[2].size(), grade);
    const auto found = numbers.find(fields[1]);
    if (grade > 0 && found != numbers.end()) {
      collection.answers[fields[0]][found->second] = grade;
    }
  });
  forEachLine(folder / "queries.tsv", 2, [&](const std::vector<std::string>& fields) {
    if (collection.answers.contains(fields[0])) {
      collection.queries.push_back({fields[0], fields[1]});
    }
  });
  return collection;
}

std::vector<Collection> collectionsInFolders(const std::vector<std::string>& folders) {
  namespace fs = std::filesystem;
  std::vector<Collection> collections;
  for (const std::string& folder : folders) {
    if (fs::exists(fs::path(folder) / "docs.tsv")) {
      collections.push_back(readCollection(folder));
      continue;
    }
    std::vector<fs::path> inside;
    for (const fs::directory_entry& entry : fs::directory_iterator(folder)) {
      if (fs::exists(entry.path() / "docs.tsv")) {
        inside.push_back(entry.path());
      }
    }
    if (inside.empty()) {
      throw std::runtime_error("no collections in " + folder);
    }
    std::sort(inside.begin(), inside.end());
    for (const fs::path& path : inside) {
      collections.push_back(readCollection(path));
    }
  }
  return collections;
}

void writeCollection(const Collection& collection, const std::filesystem::path& folder) {
  std::filesystem::create_directories(folder);
  openForWriting(folder / "language") << collection.language << '\n';
  openForWriting(folder / "origin") << collection.origin << '\n';
  std::ofstream docs = openForWriting(folder / "docs.tsv");
  for (const Document& document : collection.documents) {
    docs << oneLine(document.id) << '\t' << oneLine(document.title) << '\t'
         << oneLine(document.text()) << '\n';
  }
  std::ofstream queries = openForWriting(folder / "queries.tsv");
  std::ofstream qrels = openForWriting(folder / "qrels.tsv");
  for (const Query& query : collection.queries) {
    queries << query.id << '\t' << oneLine(query.text) << '\n';
    for (const auto& [document, grade] : collection.answers.at(query.id)) {
      qrels << query.id << '\t' << oneLine(collection.documents[document].id) << '\t' << grade
            << '\n';
    }
  }
}

void writeBook(const Collection& collection, const std::filesystem::path& folder) {
  std::filesystem::create_directories(folder);
  for (size_t i = 0; i < collection.documents.size(); ++i) {
    const Document& document = collection.documents[i];
    std::ofstream page = openForWriting(folder / bookPageName(i));
    // A page whose title was taken away must not get its first heading or its file name as one: a
    // dash is a title without a word.
    page << "<!DOCTYPE html>\n<html lang=\"" << collection.language
         << "\"><head><meta charset=\"utf-8\"><title>"
         << (document.title.empty() ? "-" : escaped(document.title)) << "</title></head><body>\n";
    for (const std::string& block : document.blocks) {
      page << "<p>" << escaped(block) << "</p>\n";
    }
    page << "</body></html>\n";
  }
}

std::string bookPageName(size_t document) {
  char name[32];
  std::snprintf(name, sizeof name, "d%06zu.html", document);
  return name;
}

size_t documentOfBookPageName(std::string_view name) {
  size_t number = SIZE_MAX;
  if (name.starts_with('d')) {
    name.remove_prefix(1);
    std::from_chars(name.data(), name.data() + name.size(), number);
  }
  return number;
}

uint64_t stableHash(std::string_view text) noexcept {
  uint64_t hash = 0xcbf29ce484222325U;
  for (const char c : text) {
    hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001b3U;
  }
  return hash;
}

}  // namespace quality

#include "bench/engines/Corpus.h"

#include <algorithm>
#include <cstdint>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace engines {

namespace {

constexpr std::string_view magic = "help pages 1\n";

void writeNumber(std::ofstream& out, size_t number) {
  const auto value = static_cast<uint32_t>(number);
  out.write(reinterpret_cast<const char*>(&value), sizeof value);
}

void writeText(std::ofstream& out, const std::string& text) {
  writeNumber(out, text.size());
  out.write(text.data(), static_cast<std::streamsize>(text.size()));
}

void writeTexts(std::ofstream& out, const std::vector<std::string>& texts) {
  writeNumber(out, texts.size());
  for (const std::string& text : texts) {
    writeText(out, text);
  }
}

class Reader {
 public:
  explicit Reader(std::string_view bytes) : _bytes(bytes) {}

  std::string_view take(size_t length) {
    if (length > _bytes.size()) {
      throw std::runtime_error("the file of pages is cut off");
    }
    const std::string_view taken = _bytes.substr(0, length);
    _bytes.remove_prefix(length);
    return taken;
  }

  size_t number() {
    uint32_t value = 0;
    take(sizeof value).copy(reinterpret_cast<char*>(&value), sizeof value);
    return value;
  }

  std::string text() { return std::string(take(number())); }

  std::vector<std::string> texts() {
    std::vector<std::string> all;
    for (size_t left = number(); left > 0; --left) {
      all.push_back(text());
    }
    return all;
  }

 private:
  std::string_view _bytes;
};

}  // namespace

size_t Book::textLength() const {
  size_t length = 0;
  for (const searchkit::Document& page : pages) {
    length += page.title ? page.title->size() : 0;
    for (const std::string& heading : page.headings) {
      length += heading.size();
    }
    for (const std::string& block : page.body) {
      length += block.size();
    }
  }
  return length;
}

size_t pageCount(const Books& books) {
  size_t count = 0;
  for (const Book& book : books) {
    count += book.pages.size();
  }
  return count;
}

size_t textLength(const Books& books) {
  size_t length = 0;
  for (const Book& book : books) {
    length += book.textLength();
  }
  return length;
}

Books split(const Books& books, size_t count) {
  const size_t pages = pageCount(books);
  Books parts(count);
  size_t number = 0;
  for (const Book& book : books) {
    for (const searchkit::Document& page : book.pages) {
      Book& part = parts[number++ * count / pages];
      part.name = "part" + std::to_string(&part - parts.data());
      part.pages.push_back(page);
      // Two manuals may have a page of the same name.
      part.pages.back().path.insert(0, "/" + book.name);
    }
  }
  for (Book& part : parts) {
    std::sort(part.pages.begin(), part.pages.end(),
              [](const auto& a, const auto& b) { return a.path < b.path; });
  }
  return parts;
}

void writeBooks(const Books& books, const std::string& path) {
  std::ofstream out(path, std::ios::binary);
  out << magic;
  writeNumber(out, books.size());
  for (const Book& book : books) {
    writeText(out, book.name);
    writeNumber(out, book.pages.size());
    for (const searchkit::Document& page : book.pages) {
      writeText(out, page.path);
      writeText(out, page.title.value_or(""));
      writeText(out, page.abstract.value_or(""));
      writeTexts(out, page.headings);
      writeTexts(out, page.body);
    }
  }
  if (!out.flush()) {
    throw std::runtime_error("cannot write " + path);
  }
}

Books readBooks(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) {
    throw std::runtime_error("cannot read " + path);
  }
  const std::string bytes{std::istreambuf_iterator<char>(in), {}};
  Reader reader(bytes);
  if (reader.take(magic.size()) != magic) {
    throw std::runtime_error(path + " is no file of pages");
  }
  Books books(reader.number());
  for (Book& book : books) {
    book.name = reader.text();
    book.pages.resize(reader.number());
    for (searchkit::Document& page : book.pages) {
      page.path = reader.text();
      page.title = reader.text();
      page.abstract = reader.text();
      page.headings = reader.texts();
      page.body = reader.texts();
    }
  }
  return books;
}

}  // namespace engines

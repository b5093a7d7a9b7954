#include "bench/tool/MadePages.h"

#include <fmt/format.h>

#include <cmath>
#include <filesystem>
#include <fstream>
#include <random>
#include <stdexcept>

namespace bench {

namespace {

/// Words by rank, the frequent ones short; their frequency falls with the rank.
class Words {
 public:
  std::string next() {
    const double place = std::uniform_real_distribution<double>(0, 1)(_random);
    auto rank = static_cast<uint32_t>(std::exp(place * std::log(60000.0)));
    std::string word;
    for (uint32_t left = rank * 7 + 3; left > 0; left /= 21) {
      word += "bcdfghjklmnpqrstvwxyz"[left % 21];
      word += "aeiou"[(left / 3 + rank) % 5];
    }
    return word;
  }

  bool often(uint32_t one) { return _random() % one == 0; }

 private:
  std::mt19937 _random{42};
};

std::string page(size_t number, size_t bytes, Words& words) {
  std::string text = fmt::format(
      "<!DOCTYPE html>\n<html lang=\"en\"><head><meta charset=\"utf-8\"><title>{} {} "
      "{}</title></head><body>\n<h1 id=\"p{}\">{}</h1>\n<p>",
      words.next(), words.next(), number, number, words.next());
  while (text.size() < bytes) {
    text += words.next();
    if (words.often(12)) {
      text += ".";
    }
    if (words.often(80)) {
      text += fmt::format("</p>\n<p id=\"a{}\">", text.size());
    } else if (words.often(40)) {
      text += " <code>" + words.next() + "</code>";
    }
    text += ' ';
  }
  return text + "</p></body></html>\n";
}

}  // namespace

void makePages(const std::string& folder, size_t count, size_t bytes) {
  Words words;
  for (size_t i = 0; i < count; ++i) {
    const std::string below = fmt::format("{}/{}", folder, i / 1000);
    if (i % 1000 == 0) {
      std::filesystem::create_directories(below);
    }
    std::ofstream file(fmt::format("{}/{}.html", below, i), std::ios::binary);
    file << page(i, bytes, words);
    if (!file.flush()) {
      throw std::runtime_error("cannot write below " + folder);
    }
  }
}

}  // namespace bench

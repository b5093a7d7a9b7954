#include "bench/daemon/MadeBooks.h"

#include <cmath>
#include <filesystem>
#include <fstream>

namespace {

constexpr uint32_t vocabulary = 20'000;

/// Syllables, so that words have beginnings in common.
std::string wordOfNumber(uint32_t number) {
  static constexpr const char* syllables[] = {"ba", "co", "di", "fe", "gu", "ha", "jo",
                                              "ki", "la", "me", "no", "pu", "ra", "se",
                                              "ti", "vo", "wi", "xa", "yo", "zu"};
  std::string word;
  do {
    word += syllables[number % 20];
    number /= 20;
  } while (number > 0);
  return word;
}

}  // namespace

std::string MadeBooks::word(size_t length) {
  // Zipf's law: the logarithm of the rank is even.
  const double share = std::uniform_real_distribution<double>(0, 1)(_random);
  const auto rank = static_cast<uint32_t>(std::pow(double{vocabulary}, share));
  const std::string word = wordOfNumber(rank * 7919 % vocabulary);
  return length == 0 ? word : word.substr(0, length);
}

void MadeBooks::touch(const std::string& name, int page, int wordCount) {
  const std::filesystem::path folder = std::filesystem::path(_folder) / name;
  std::filesystem::create_directories(folder);
  std::ofstream file(folder / (page == 0 ? "index.html" : "page" + std::to_string(page) + ".html"));
  const std::string title = word() + " " + word() + " " + word();
  file << "<html><head><title>" << title << "</title></head><body><h1>" << title << "</h1>";
  for (int i = 0; i < wordCount; ++i) {
    file << (i % 80 == 0 ? "<p>" : "") << word() << ' ';
  }
}

void MadeBooks::write(const std::string& name, int pageCount, int wordCount) {
  for (int page = 0; page < pageCount; ++page) {
    touch(name, page, wordCount);
  }
}

void MadeBooks::remove(const std::string& name) const {
  std::filesystem::remove_all(std::filesystem::path(_folder) / name);
}

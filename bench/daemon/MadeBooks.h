// Help books whose words are made up, which come and go.
#pragma once

#include <cstdint>
#include <random>
#include <string>

/// Writes books of pages into a help folder, and takes them away again. Words are as frequent as
/// words are: few are common, most are rare. Thread-safety: confined to one thread.
class MadeBooks {
 public:
  /// In `folder`, a folder of one language (…/help/en).
  explicit MadeBooks(std::string folder, uint32_t seed = 1)
      : _folder(std::move(folder)), _random(seed) {}

  /// Writes the book anew.
  void write(const std::string& name, int pageCount, int wordCount);
  /// Writes one page of the book anew.
  void touch(const std::string& name, int page, int wordCount);
  void remove(const std::string& name) const;

  /// One of the words, or with `length` the beginning of one.
  std::string word(size_t length = 0);

 private:
  std::string _folder;
  std::mt19937 _random;
};

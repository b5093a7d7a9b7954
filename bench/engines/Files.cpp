#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <stdexcept>

#include "bench/engines/Engine.h"

namespace engines {

std::string Question::text() const {
  std::string text;
  for (const std::string& term : terms) {
    text += term;
    text += isPrefix ? "* " : " ";
  }
  return text;
}

std::string imagePath(const std::string& folder, size_t book) {
  std::string number = std::to_string(book);
  number.insert(0, 4 - std::min<size_t>(number.size(), 4), '0');
  return folder + "/" + number;
}

void writeImage(const std::string& folder, size_t book, const void* bytes, size_t length) {
  std::filesystem::create_directories(folder);
  std::ofstream out(imagePath(folder, book), std::ios::binary);
  out.write(static_cast<const char*>(bytes), static_cast<std::streamsize>(length));
  if (!out.flush()) {
    throw std::runtime_error("cannot write in " + folder);
  }
}

Images mapFolder(const std::string& folder) {
  Images images;
  for (size_t book = 0;; ++book) {
    const std::string path = imagePath(folder, book);
    const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (file < 0) {
      break;
    }
    struct stat status = {};
    fstat(file, &status);
    const auto length = static_cast<size_t>(status.st_size);
    void* const bytes = mmap(nullptr, length, PROT_READ, MAP_PRIVATE, file, 0);
    if (bytes == MAP_FAILED) {
      throw std::runtime_error("cannot map " + path);
    }
    images.push_back({static_cast<const uint8_t*>(bytes), length, file});
  }
  if (images.empty()) {
    throw std::runtime_error("nothing in " + folder);
  }
  return images;
}

size_t totalLength(const Images& images) {
  size_t length = 0;
  for (const Image& image : images) {
    length += image.length;
  }
  return length;
}

}  // namespace engines

#include "bvmake/IncludedFiles.h"

#include <filesystem>
#include <system_error>
#include <utility>

#include "bvmake/ASCII.h"
#include "bvmake/CharacterSet.h"
#include "bvmake/PageReader.h"
#include "platform/Files.h"

namespace bvmake {

namespace {

namespace fs = std::filesystem;

std::optional<unsigned> hexDigit(char character) {
  const char lower = lowercased(character);
  if (lower >= '0' && lower <= '9') {
    return static_cast<unsigned>(lower - '0');
  }
  return lower >= 'a' && lower <= 'f' ? std::optional(static_cast<unsigned>(lower - 'a') + 10)
                                      : std::nullopt;
}

std::string unescaped(std::string_view reference) {
  std::string path;
  for (size_t at = 0; at < reference.size(); ++at) {
    if (reference[at] == '%' && at + 2 < reference.size()) {
      const auto high = hexDigit(reference[at + 1]);
      const auto low = hexDigit(reference[at + 2]);
      if (high && low) {
        path += static_cast<char>(*high << 4 | *low);
        at += 2;
        continue;
      }
    }
    path += reference[at];
  }
  return path;
}

/// "http:" and the like: a letter and more before a colon that no slash precedes.
bool hasScheme(std::string_view reference) {
  const size_t end = reference.find_first_of(":/");
  return end != std::string_view::npos && end > 0 && reference[end] == ':' &&
         isLetter(reference.front());
}

}  // namespace

IncludedFiles::IncludedFiles(const std::string& folder,
                             std::shared_ptr<platform::FileManager> files)
    : _files(std::move(files)) {
  std::error_code code;
  const std::string root = fs::canonical(folder, code).string();
  if (!code) {
    _inside = root == "/" ? root : root + "/";
  }
}

std::string IncludedFiles::nameOfFile(const std::string& file) {
  std::error_code code;
  const std::string name = fs::canonical(file, code).string();
  return code ? file : name;
}

std::optional<DocBookFile> IncludedFiles::load(const std::string& from, std::string_view reference,
                                               std::string& why) const {
  if (hasScheme(reference)) {
    why = "only files are included";
    return std::nullopt;
  }
  const std::string path = unescaped(reference.substr(0, reference.find('#')));
  if (path.empty() || path.find('\0') != std::string::npos) {
    why = "no name of a file";
    return std::nullopt;
  }
  std::error_code code;
  const fs::path target = fs::canonical(fs::path(from).parent_path() / path, code);
  if (code) {
    why = code.message();
    return std::nullopt;
  }
  std::string name = target.string();
  if (_inside.empty() || !name.starts_with(_inside)) {
    why = "it lies outside the folder";
    return std::nullopt;
  }
  if (!fs::is_regular_file(target, code)) {
    why = "no regular file";
    return std::nullopt;
  }
  const uintmax_t size = fs::file_size(target, code);
  if (!code && size > maximumIncludedBytes) {
    why = tooLargeError().description;
    return std::nullopt;
  }
  platform::Error error;
  const auto bytes = _files->contentsAtPath(name, &error);
  if (!bytes) {
    why = error.description;
    return std::nullopt;
  }
  std::optional<std::string> text = textFromBytes(bytes->view(), Markup::xml);
  if (!text) {
    why = "no text, but binary data";
    return std::nullopt;
  }
  return DocBookFile{std::move(name), std::move(*text)};
}

}  // namespace bvmake

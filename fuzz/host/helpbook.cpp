// Book folders and the lists that books carry, from arbitrary bytes.
//
// The first byte says how the rest is used: an even one makes all of it the book's information
// list; an odd one gives that many (times 16) bytes to the book's list and the rest to the list of
// its German folder. The same bytes are also read as exact-match and suggestions lists.
#include <cstdint>
#include <cstdlib>
#include <map>
#include <string>
#include <string_view>

#include "host/Zebrine/ZEBBookLists.h"
#include "host/Zebrine/ZEBDescription.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"

namespace {

const std::string bookFolder = "/book";

/// A book folder that exists in memory only; every file that is asked for is there, so that all
/// paths of a list come through.
class BookFiles : public platform::FileManager {
 public:
  void setFile(const std::string& path, std::string_view bytes) {
    _files[path] = platform::Data::copy(bytes);
  }

  bool fileExistsAtPath(const std::string& path, bool* isDirectory) const override {
    if (isDirectory != nullptr) {
      *isDirectory = path.ends_with(".lproj") || path.ends_with("/Resources");
    }
    return true;
  }
  std::optional<platform::Data> contentsMappedAtPath(const std::string& path,
                                                     platform::Error* /*error*/) const override {
    const auto file = _files.find(path);
    return file == _files.end() ? std::nullopt : std::optional(file->second);
  }
  std::optional<platform::Data> contentsAtPath(const std::string& path,
                                               platform::Error* error) const override {
    return contentsMappedAtPath(path, error);
  }
  std::optional<std::vector<std::string>> namesInDirectory(
      const std::string& /*path*/) const override {
    return std::vector<std::string>{"de.lproj", "en.lproj"};
  }

 private:
  std::map<std::string, platform::Data> _files;
};

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void requireInside(const std::optional<std::string>& path) {
  require(!path ||
          (path->starts_with(bookFolder + "/") && (*path + "/").find("/../") == std::string::npos &&
           path->find('\0') == std::string::npos));
}

void requireStableURL(std::string_view string) {
  const auto url = URLByEscapingString(string);
  if (url) {
    require(URLByEscapingString(url->absoluteString()) == url);
  } else {
    require(string.empty() || string.find('\0') != std::string_view::npos);
  }
  const std::string secure = addSSLAsNecessary(string);
  require(addSSLAsNecessary(secure) == secure);
}

void readBook(std::string_view list, std::string_view germanList) {
  auto files = std::make_shared<BookFiles>();
  for (const char* root : {"/book/", "/book/Resources/"}) {
    files->setFile(std::string(root) + "Info.plist", list);
    files->setFile(std::string(root) + "de.lproj/Info.plist", germanList);
  }
  platform::Environment environment = platform::Environment::system();
  environment.files = files;
  environment.preferredLanguages = {"de"};
  const platform::EnvironmentOverride override(std::move(environment));

  const auto book = ZEBHelpBook::initWithPath(bookFolder);
  if (book == nullptr) {
    return;
  }
  require(ZEBHelpBook::isValidBookID(book->bookID()));
  require(book->type() >= 1 && book->type() <= 4);
  require(book->path() == bookFolder);
  requireInside(book->accessPagePath());
  requireInside(book->exactMatchPath());
  requireInside(book->suggestionsPath());
  for (const std::string& path : book->indexPaths()) {
    requireInside(path);
  }
  const std::string unversioned = ZEBHelpBook::unversionedbookIDFromBookID(book->bookID());
  require(ZEBHelpBook::unversionedbookIDFromBookID(unversioned) == unversioned);
  if (const auto root = book->remoteURL()) {
    require(!root->scheme().empty());
    const auto page = ZEBHelpBook::_urlForType4HelpBookResult(book->title(), book->bookID());
    require(!page || book->type() == 4);
  }
  require(!book->description().empty());
}

void readLists(std::string_view bytes) {
  const auto list = platform::propertyListFromData(platform::Data::copy(bytes));
  if (!list) {
    return;
  }
  require(list->stringIf() != nullptr ||
          ZEBDescription(*list).size() <= ZEBDescriptionMaximumLength + 3);
  for (const std::string& text : ZEBSuggestionsWithPrefix(*list, "p")) {
    ZEBSuggestionAnchor(*list, text);
    ZEBExactMatchAnchor(*list, platform::stringByRemovingWhitespace(text));
    requireStableURL(text);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  if (input.empty()) {
    return 0;
  }
  const std::string_view rest = input.substr(1);
  const size_t first = data[0] % 2 == 0 ? rest.size() : std::min(size_t{data[0]} * 16, rest.size());
  readBook(rest.substr(0, first), rest.substr(first));
  readLists(rest);
  requireStableURL(rest);
  return 0;
}

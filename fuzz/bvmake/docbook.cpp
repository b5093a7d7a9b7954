// Any bytes as a DocBook document with the files that it includes: the first file ends at a line
// "%%%%", and so does each that follows; they are called 0, 1, 2 … Whatever comes out must be what
// Page promises.
#include <cstdint>
#include <cstdlib>
#include <string>
#include <unordered_set>
#include <vector>

#include "bvmake/PageReader.h"
#include "bvmake/TextRun.h"
#include "platform/Strings.h"

namespace {

constexpr std::string_view mark = "\n%%%%\n";

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void requireText(const std::string& text) {
  require(!text.empty());
  require(platform::isValidUTF8(text));
  require(text.find('\0') == std::string::npos);
  require(bvmake::collapsedText(text) == text);
}

std::vector<std::string> filesOf(std::string_view bytes) {
  std::vector<std::string> files;
  while (files.size() < 8) {
    const size_t end = bytes.find(mark);
    files.emplace_back(bytes.substr(0, end));
    if (end == std::string_view::npos) {
      break;
    }
    bytes.remove_prefix(end + mark.size());
  }
  return files;
}

void check(const bvmake::DocBookPages& document) {
  require(!document.pages.empty());
  std::unordered_set<std::string> anchors;
  std::unordered_set<std::string> fragments;
  for (const bvmake::Page& page : document.pages) {
    require(fragments.insert(page.fragment).second);
    for (const std::string* text : {&page.title, &page.description}) {
      if (!text->empty()) {
        requireText(*text);
      }
    }
    for (const std::string& keyword : page.keywords) {
      requireText(keyword);
    }
    for (const std::string& heading : page.headings) {
      requireText(heading);
    }
    for (const bvmake::TextBlock& block : page.body) {
      requireText(block.text);
    }
    for (const std::string& anchor : page.anchors) {
      require(!anchor.empty() && platform::isValidUTF8(anchor));
      require(anchors.insert(anchor).second);
    }
  }
  for (const std::string& note : document.notes) {
    require(!note.empty());
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::vector<std::string> files = filesOf({reinterpret_cast<const char*>(data), size});
  const bvmake::DocBookLoader load = [&files](
                                         const std::string&, std::string_view reference,
                                         std::string& why) -> std::optional<bvmake::DocBookFile> {
    for (size_t i = 1; i < files.size(); ++i) {
      if (reference == std::to_string(i - 1)) {
        return bvmake::DocBookFile{std::string(reference),
                                   platform::stringByRepairingUTF8(files[i].c_str())};
      }
    }
    why = "not there";
    return std::nullopt;
  };
  platform::Error error;
  if (const auto document = bvmake::readDocBookPages("main", files[0], load, &error)) {
    check(*document);
  } else {
    require(!error.description.empty());
  }
  return 0;
}

#include "bvmake/SemanticData.h"

#include <algorithm>
#include <map>
#include <string>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXLanguage.h"
#include "host/Luxwell/LUXLanguageGuess.h"
#include "platform/Files.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

constexpr std::string_view languageFolderExtension = "lproj";

/// The tokenizer for the innermost folder of the path that is named after a language; null where
/// there is none.
std::shared_ptr<const HelpTokenizer> tokenizerForFolder(std::string_view folder) {
  std::string path(folder);
  while (!path.empty() && path != "/") {
    const std::string name = platform::lastPathComponent(path);
    if (platform::lowercaseString(platform::pathExtension(name)) == languageFolderExtension) {
      const std::string_view tag =
          std::string_view(name).substr(0, name.size() - languageFolderExtension.size() - 1);
      if (auto tokenizer = HelpTokenizer::tokenizerForLanguage(tag)) {
        return tokenizer;
      }
    }
    path = platform::stringByDeletingLastPathComponent(path);
  }
  return nullptr;
}

/// Calls `sink` with each block of text but the title, which is told apart.
template <typename Sink>
void forEachBlock(const Page& page, Sink sink) {
  if (!page.description.empty()) {
    sink(page.description);
  }
  std::for_each(page.keywords.begin(), page.keywords.end(), sink);
  std::for_each(page.headings.begin(), page.headings.end(), sink);
  for (const TextBlock& block : page.body) {
    sink(block.text);
  }
}

}  // namespace

LUXDocumentView semanticDocument(const PreparedPage& prepared) {
  LUXDocumentView document;
  document.key = prepared.path;
  document.key.remove_prefix(document.key.starts_with('/') ? 1 : 0);
  document.title = prepared.title;
  if (!prepared.abstract.empty()) {
    document.description = prepared.abstract;
  }
  document.excludedFromSearch = prepared.page.excludedFromSearch;
  forEachBlock(prepared.page,
               [&](const std::string& block) { document.blocks.emplace_back(block); });
  return document;
}

bool isLanguage(std::string_view language) { return LUXLanguage::withTag(language) != nullptr; }

std::shared_ptr<const HelpTokenizer> tokenizerForBook(std::string_view folder,
                                                      std::string_view language) {
  return language.empty() ? tokenizerForFolder(folder)
                          : HelpTokenizer::tokenizerForLanguage(language);
}

std::shared_ptr<const HelpTokenizer> tokenizerForPages(
    const std::vector<const PreparedPage*>& pages) {
  std::map<const LUXLanguage*, size_t> said;
  for (const PreparedPage* const page : pages) {
    if (const LUXLanguage* language = LUXLanguage::withTag(page->page.language)) {
      ++said[language];
    }
  }
  if (!said.empty()) {
    const auto most = std::max_element(
        said.begin(), said.end(), [](const auto& a, const auto& b) { return a.second < b.second; });
    return HelpTokenizer::tokenizerForLanguage(most->first->tag);
  }
  LUXLanguageGuess guess;
  for (const PreparedPage* const page : pages) {
    guess.addText(page->title);
    forEachBlock(page->page, [&](const std::string& block) { guess.addText(block); });
  }
  return HelpTokenizer::tokenizerForLanguage(guess.language().tag);
}

}  // namespace bvmake

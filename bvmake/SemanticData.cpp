#include "bvmake/SemanticData.h"

#include <algorithm>
#include <map>
#include <utility>

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
std::shared_ptr<const HelpTokenizer> languageOfFolder(std::string_view folder) {
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

LUXDocument documentFromPage(std::string_view path, const std::string& title,
                             const std::string& abstract, const Page& page) {
  LUXDocument document;
  document.key = path.substr(path.starts_with('/') ? 1 : 0);
  document.title = title;
  if (!abstract.empty()) {
    document.description = abstract;
  }
  document.excludedFromSearch = page.excludedFromSearch;
  if (!page.description.empty()) {
    document.blocks.push_back(page.description);
  }
  document.blocks.insert(document.blocks.end(), page.keywords.begin(), page.keywords.end());
  document.blocks.insert(document.blocks.end(), page.headings.begin(), page.headings.end());
  for (const TextBlock& block : page.body) {
    document.blocks.push_back(block.text);
  }
  return document;
}

}  // namespace

SemanticData::SemanticData(std::string_view folder, std::string_view language)
    : _tokenizer(language.empty() ? languageOfFolder(folder)
                                  : HelpTokenizer::tokenizerForLanguage(language)) {}

SemanticData::~SemanticData() = default;

bool SemanticData::isLanguage(std::string_view language) {
  return LUXLanguage::withTag(language) != nullptr;
}

void SemanticData::addPage(std::string_view path, const std::string& title,
                           const std::string& abstract, const Page& page) {
  LUXDocument document = documentFromPage(path, title, abstract, page);
  if (_writer != nullptr) {
    _writer->addDocument(document);
    return;
  }
  _waiting.push_back({std::move(document), page.language});
  if (_tokenizer != nullptr || _waiting.size() >= languageSample) {
    _decideLanguage();
  }
}

void SemanticData::_decideLanguage() {
  if (_tokenizer == nullptr) {
    _tokenizer = _languageOfPages();
  }
  _languageTag = _tokenizer->languageTag();
  _writer = std::make_unique<LUXIndexWriter>(_tokenizer);
  for (const Waiting& waiting : _waiting) {
    _writer->addDocument(waiting.document);
  }
  _waiting.clear();
}

std::shared_ptr<const HelpTokenizer> SemanticData::_languageOfPages() const {
  std::map<const LUXLanguage*, size_t> said;
  for (const Waiting& waiting : _waiting) {
    if (const LUXLanguage* language = LUXLanguage::withTag(waiting.language)) {
      ++said[language];
    }
  }
  if (!said.empty()) {
    const auto most = std::max_element(
        said.begin(), said.end(), [](const auto& a, const auto& b) { return a.second < b.second; });
    return HelpTokenizer::tokenizerForLanguage(most->first->tag);
  }
  LUXLanguageGuess guess;
  for (const Waiting& waiting : _waiting) {
    guess.addText(waiting.document.title);
    for (const std::string& block : waiting.document.blocks) {
      guess.addText(block);
    }
  }
  return HelpTokenizer::tokenizerForLanguage(guess.language().tag);
}

platform::Data SemanticData::finish() {
  if (_writer == nullptr) {
    _decideLanguage();
  }
  return _writer->finish();
}

}  // namespace bvmake

// Any text in any language: what the tokenizer, the guess of the language and the writer of a
// book's data make of it. The first byte chooses the language; the rest is the text, whose lines
// become pages of a book.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXIndexWriter.h"
#include "host/Luxwell/LUXLanguage.h"
#include "host/Luxwell/LUXLanguageGuess.h"
#include "platform/Strings.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void requireToken(const std::string& token) {
  require(!token.empty() && token.size() <= HelpTokenizer::maximumFormLength);
  require(platform::isValidUTF8(token));
}

void requireWords(const HelpTokenizer& tokenizer, std::string_view text) {
  std::vector<HelpTokenizer::Word> words;
  tokenizer.wordsOfText(text, words);
  require(words.empty() || words.front().breaksChain);
  for (const HelpTokenizer::Word& word : words) {
    requireToken(word.form);
    requireToken(word.stem);
    requireToken(word.surface);
    require(word.wholeForm.empty() || !word.breaksChain);
    require(platform::isValidUTF8(word.wholeForm));
  }
  const std::string tokenized = tokenizer.tokenizedStringFromString(text);
  require(tokenized.empty() == words.empty());
  require(HelpTokenizer::countOfGramsInTokenString(tokenized, " ") <= words.size());
}

// The lines as pages, the first of them as the title of each.
void requireBook(const std::shared_ptr<const HelpTokenizer>& tokenizer, std::string_view text) {
  LUXIndexWriter writer(tokenizer);
  const std::string title = platform::stringByRepairingUTF8(text.substr(0, text.find('\n')));
  while (!text.empty() && writer.documentCount() < 20) {
    const size_t end = std::min(text.find('\n'), text.size());
    LUXDocument page;
    page.key = std::to_string(writer.documentCount());
    page.title = title;
    page.blocks.emplace_back(text.substr(0, end));
    writer.addDocument(page);
    text.remove_prefix(std::min(end + 1, text.size()));
  }
  const size_t count = writer.documentCount();
  const auto index = HelpLUXIndex::initWithVersionedData(writer.finish());
  require(index != nullptr && index->documentKeys().size() == count);
  std::shared_ptr<const LUXTokenTable> table;
  for (const std::string& key : index->documentKeys()) {
    const LUXTokenCounts counts = index->tokenCountsForKey(key);
    // A table that could not be read would leave the page without tokens.
    std::vector<HelpTokenizer::Word> words;
    tokenizer->wordsOfText(title, words);
    require(words.empty() || !counts.empty());
    table = counts.table();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size == 0) {
    return 0;
  }
  const auto languages = LUXLanguage::all();
  const LUXLanguage& language = languages[data[0] % languages.size()];
  const std::string_view text(reinterpret_cast<const char*>(data) + 1, size - 1);
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage(language.tag);
  require(tokenizer != nullptr);
  requireWords(*tokenizer, text);
  requireBook(tokenizer, text);
  HelpTokenizer::luxLocalizationForLanguage(text);
  LUXLanguageGuess guess;
  guess.addText(text);
  require(HelpTokenizer::tokenizerForLanguage(guess.language().tag) != nullptr);
  return 0;
}

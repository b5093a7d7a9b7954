#include "bvmake/Summary.h"

#include <unicode/brkiter.h>
#include <unicode/uchar.h>
#include <unicode/utext.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <new>
#include <string_view>
#include <vector>

#include "platform/Exception.h"

namespace bvmake {

namespace {

/// More of a block than can ever matter.
constexpr size_t blockRange = 4096;

constexpr size_t shortestLeadIn = 40;

size_t characterCount(std::string_view text) {
  return static_cast<size_t>(std::count_if(text.begin(), text.end(), [](char character) {
    return (static_cast<unsigned char>(character) & 0xC0U) != 0x80U;
  }));
}

/// The beginning of the text, cut between characters.
std::string_view beginning(std::string_view text, size_t bytes) {
  if (text.size() <= bytes) {
    return text;
  }
  size_t end = bytes;
  while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U) {
    --end;
  }
  return text.substr(0, end);
}

/// Whether the last character, closing quotes and brackets aside, ends a sentence in some script.
bool hasSentenceEnd(std::string_view text) {
  auto at = static_cast<int32_t>(std::min<size_t>(text.size(), INT32_MAX));
  while (at > 0) {
    UChar32 character = 0;
    U8_PREV(text.data(), 0, at, character);
    if (character < 0) {
      return false;
    }
    if (u_hasBinaryProperty(character, UCHAR_S_TERM)) {
      return true;
    }
    const int32_t sentenceClass = u_getIntPropertyValue(character, UCHAR_SENTENCE_BREAK);
    if (sentenceClass != U_SB_CLOSE) {
      return false;
    }
  }
  return false;
}

/// Whether a block reads as sentences. One that leads up to a list or a program with a colon does,
/// unless it is so short that it is a label; one that breaks off in dots is the caption of
/// something to open.
bool readsAsSentences(std::string_view text) {
  if (text.ends_with("...") || text.ends_with("\u2026")) {
    return false;
  }
  if (text.ends_with(':') || text.ends_with("\uFF1A")) {
    return characterCount(text) >= shortestLeadIn;
  }
  return hasSentenceEnd(text);
}

/// `text` cut to `length` characters at a blank where there is one not far away.
std::string cutBetweenWords(std::string_view text, size_t length) {
  size_t end = 0;
  size_t lastBlank = 0;
  for (size_t count = 0; count + 1 < length && end < text.size(); ++count) {
    if (text[end] == ' ') {
      lastBlank = end;
    }
    U8_FWD_1(text.data(), end, text.size());
  }
  // Scripts without blanks between words are cut between characters.
  const size_t cut = lastBlank > end / 2 ? lastBlank : end;
  return std::string(text.substr(0, cut)) + "\u2026";
}

}  // namespace

struct Summarizer::Implementation {
  std::unique_ptr<icu::BreakIterator> sentences;
  UText text = UTEXT_INITIALIZER;

  Implementation() {
    UErrorCode status = U_ZERO_ERROR;
    sentences.reset(icu::BreakIterator::createSentenceInstance(icu::Locale::getRoot(), status));
    if (U_FAILURE(status)) {
      throw platform::Exception(platform::invalidArgumentException,
                                "no rules for dividing sentences");
    }
  }
  ~Implementation() { utext_close(&text); }
  Implementation(const Implementation&) = delete;
  Implementation& operator=(const Implementation&) = delete;

  /// Adds the block's sentences; false when the summary is full.
  bool add(std::string& summary, std::string_view wholeBlock) {
    const std::string_view block = beginning(wholeBlock, blockRange);
    UErrorCode status = U_ZERO_ERROR;
    utext_openUTF8(&text, block.data(), static_cast<int64_t>(block.size()), &status);
    sentences->setText(&text, status);
    if (U_FAILURE(status)) {
      return true;
    }
    int32_t start = sentences->first();
    for (int32_t end = sentences->next(); end != icu::BreakIterator::DONE;
         start = end, end = sentences->next()) {
      std::string_view sentence =
          block.substr(static_cast<size_t>(start), static_cast<size_t>(end - start));
      while (!sentence.empty() && sentence.back() == ' ') {
        sentence.remove_suffix(1);
      }
      if (!addSentence(summary, sentence)) {
        return false;
      }
    }
    return true;
  }

  static bool addSentence(std::string& summary, std::string_view sentence) {
    const size_t sentenceLength = characterCount(sentence);
    if (summary.empty()) {
      summary = sentenceLength > maximumSummaryLength
                    ? cutBetweenWords(sentence, maximumSummaryLength)
                    : std::string(sentence);
    } else {
      if (characterCount(summary) + 1 + sentenceLength > maximumSummaryLength) {
        return false;
      }
      summary += ' ';
      summary += sentence;
    }
    return characterCount(summary) < wantedSummaryLength;
  }
};

Summarizer::Summarizer() : _implementation(std::make_unique<Implementation>()) {}

Summarizer::~Summarizer() = default;

std::string Summarizer::summary(const Page& page) {
  std::string summary;
  const auto addBlocks = [&](auto wanted) {
    for (const TextBlock& block : page.body) {
      if (wanted(block) && !_implementation->add(summary, block.text)) {
        return;
      }
    }
  };
  const auto isProse = [](const TextBlock& block) { return block.kind == TextBlock::Kind::prose; };
  addBlocks([&](const TextBlock& block) { return isProse(block) && readsAsSentences(block.text); });
  if (summary.empty()) {
    addBlocks(isProse);
  }
  if (summary.empty()) {
    addBlocks([](const TextBlock&) { return true; });
  }
  for (size_t i = 0; summary.empty() && i < page.headings.size(); ++i) {
    _implementation->add(summary, page.headings[i]);
  }
  if (summary.empty()) {
    _implementation->add(summary, page.title);
  }
  return summary;
}

}  // namespace bvmake

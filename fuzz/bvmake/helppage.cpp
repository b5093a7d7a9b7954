// Any bytes as a help page of either kind: whatever comes out must be what Page promises, and a
// page of HTML that is read without the parser must be the one that the parser reads.
#include <cstdint>
#include <cstdlib>
#include <string>
#include <unordered_set>

#include "bvmake/CharacterSet.h"
#include "bvmake/HTMLPage.h"
#include "bvmake/PageReader.h"
#include "bvmake/Summary.h"
#include "bvmake/TextRun.h"
#include "platform/Strings.h"

namespace {

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

void requireTextOrNothing(const std::string& text) {
  if (!text.empty()) {
    requireText(text);
  }
}

void check(const bvmake::Page& page, bvmake::Summarizer& summarizer) {
  requireTextOrNothing(page.title);
  requireTextOrNothing(page.description);
  for (const std::string& keyword : page.keywords) {
    requireText(keyword);
  }
  for (const std::string& heading : page.headings) {
    requireText(heading);
  }
  for (const bvmake::TextBlock& block : page.body) {
    requireText(block.text);
  }
  std::unordered_set<std::string> anchors;
  for (const std::string& anchor : page.anchors) {
    require(!anchor.empty() && platform::isValidUTF8(anchor));
    require(anchors.insert(anchor).second);
  }
  const std::string summary = summarizer.summary(page);
  require(platform::isValidUTF8(summary));
  require(summary.size() <= 4 * bvmake::maximumSummaryLength);
}

void checkParsing(std::string_view bytes) {
  const auto text = bvmake::textFromBytes(bytes, bvmake::Markup::html);
  if (text) {
    require(bvmake::readHTMLPage(*text, nullptr, bvmake::HTMLParsing::whereNeeded) ==
            bvmake::readHTMLPage(*text, nullptr, bvmake::HTMLParsing::always));
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static bvmake::Summarizer summarizer;
  const std::string_view bytes(reinterpret_cast<const char*>(data), size);
  checkParsing(bytes);
  for (const bvmake::PageKind kind : {bvmake::PageKind::html, bvmake::PageKind::mallard}) {
    platform::Error error;
    if (const auto page = bvmake::readPage(kind, bytes, &error)) {
      check(*page, summarizer);
    } else {
      require(!error.description.empty());
    }
  }
  return 0;
}

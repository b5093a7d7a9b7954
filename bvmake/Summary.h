// Abstracts for pages whose author wrote none.
#pragma once

#include <cstddef>
#include <memory>
#include <string>

#include "bvmake/Page.h"

namespace bvmake {

/// Sentences are added until an abstract has at least this many characters …
inline constexpr size_t wantedSummaryLength = 200;
/// … and left out where they would make it longer than this. A first sentence that alone is longer
/// is cut between words, an ellipsis at its end.
inline constexpr size_t maximumSummaryLength = 300;

/// Cuts abstracts from pages: the first sentences of the body, as Unicode divides sentences. Blocks
/// that read as sentences come first; where a page has none, any prose, then any text of the
/// body, then the headings, then the title serves. Thread-safety: confined to one thread.
class Summarizer {
 public:
  Summarizer();
  ~Summarizer();
  Summarizer(const Summarizer&) = delete;
  Summarizer& operator=(const Summarizer&) = delete;

  /// The abstract; empty only for a page without any text.
  std::string summary(const Page& page);

 private:
  struct Implementation;
  std::unique_ptr<Implementation> _implementation;
};

}  // namespace bvmake

#include "SearchKit/SKIndex.h"

#include <string>
#include <unordered_set>
#include <utility>

#include "SearchKit/IndexReader.h"
#include "SearchKit/Tokenizer.h"
#include "platform/Files.h"
#include "platform/Strings.h"

namespace {

// Values are shown and written on; an index from elsewhere may have any bytes for text.
platform::Value textValue(std::string_view text) {
  return platform::isValidUTF8(text) ? platform::Value(text)
                                     : platform::Value(platform::stringByRepairingUTF8(text));
}

}  // namespace

SKIndexRef SKIndexOpenWithData(const platform::Data& data, std::string_view name) {
  if (!name.empty()) {
    return nullptr;
  }
  const std::optional<searchkit::IndexView> view = searchkit::IndexView::make(data.span());
  return view ? std::make_shared<const SKIndex>(data, *view) : nullptr;
}

bool SKIndexVerifyChecksums(const SKIndexRef& index) {
  return index != nullptr && searchkit::indexSummary(*index).isIntact;
}

SKTermID SKIndexGetMaximumTermID(const SKIndexRef& index) {
  return index != nullptr ? SKTermID{index->view().termCount()} : 0;
}

std::vector<std::string> SKIndexCopyUniqueTerms(const SKIndexRef& index, std::string_view text) {
  std::vector<std::string> terms;
  if (index == nullptr) {
    return terms;
  }
  std::unordered_set<std::string> seen;
  searchkit::Tokenizer tokenizer;
  tokenizer.tokenize(text, [&](std::string_view term, bool) {
    if (seen.emplace(term).second) {
      terms.emplace_back(term);
    }
  });
  return terms;
}

std::vector<SKDocumentRef> SKIndexCopyDocumentRefsForDocumentIDs(
    const SKIndexRef& index, std::span<const SKDocumentID> ids) {
  std::vector<SKDocumentRef> references;
  references.reserve(ids.size());
  for (const SKDocumentID id : ids) {
    const auto texts = index != nullptr ? index->view().documentTexts(id) : std::nullopt;
    references.push_back(texts ? std::make_shared<const SKDocument>(std::string(texts->path))
                               : nullptr);
  }
  return references;
}

SKDocumentRef SKDocumentCreateWithURL(const platform::URL& url) {
  std::string path = url.isFileURL() ? url.path() : std::string();
  return path.empty() ? nullptr : std::make_shared<const SKDocument>(std::move(path));
}

std::optional<platform::URL> SKDocumentCopyURL(const SKDocument& document) {
  return platform::URL::fileURLWithPath(document.path());
}

std::string SKDocumentGetName(const SKDocument& document) {
  return platform::lastPathComponent(document.path());
}

std::optional<platform::Value> SKIndexCopyDocumentProperties(const SKIndexRef& index,
                                                             const SKDocument& document) {
  if (index == nullptr) {
    return std::nullopt;
  }
  const searchkit::IndexView& view = index->view();
  const std::optional<uint32_t> id = view.documentIDForPath(document.path());
  const auto texts = id ? view.documentTexts(*id) : std::nullopt;
  if (!texts || (!texts->title && !texts->abstract)) {
    return std::nullopt;
  }
  platform::Value::Dictionary properties;
  if (texts->title) {
    properties.emplace("T", textValue(*texts->title));
  }
  if (texts->abstract) {
    properties.emplace("D", textValue(*texts->abstract));
  }
  return platform::Value(std::move(properties));
}

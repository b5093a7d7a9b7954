// Catalogues of remote books, from arbitrary bytes. What is read comes out of what is written.
#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Digest.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void requireSecure(const platform::URL& url, bool isLocalAllowed) {
  require(url.scheme() == "https" || (isLocalAllowed && url.scheme() == "http"));
  require(!url.host().empty());
}

void readAt(std::string_view input, const char* place) {
  const platform::URL url = *platform::URL::URLWithString(place);
  const bool isLocal = url.scheme() == "http";
  platform::Error error;
  const auto catalogue = RNXCatalogue::catalogueWithData(platform::Data::copy(input), url, &error);
  require(catalogue || !error.description.empty());
  if (!catalogue) {
    return;
  }
  for (const RNXCatalogueEntry& book : catalogue->books) {
    require(ZEBHelpBook::isValidBookID(book.identifier));
    require(!book.locale || ZEBHelpBook::isValidBookID(*book.locale));
    if (book.pages) {
      requireSecure(*book.pages, isLocal);
    }
    for (const auto& asset : {book.searchIndex, book.exactMatch}) {
      if (asset) {
        requireSecure(asset->url, isLocal);
        require(platform::isSHA256Digest(asset->sha256));
      }
    }
    require(catalogue->bookWithIdentifier(book.identifier, book.locale.value_or(""), {}) == &book);
  }
  const std::string text = catalogue->text();
  const auto again = RNXCatalogue::catalogueWithData(platform::Data::copy(text), url);
  require(again && again->text() == text && again->books.size() == catalogue->books.size());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  readAt(input, "https://help.example.org/books/catalogue.json");
  readAt(input, "http://localhost:8080/catalogue.json");
  return 0;
}

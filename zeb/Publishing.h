// From help books to a folder that any static web server can serve.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/Zebrine/RNXCatalogue.h"

namespace zeb {

class Console;
struct BookEdition;

/// A site: a catalogue (docs/formats/remote-book.md) with the files that it names, all URLs
/// relative, so that the folder may be served from anywhere.
///
///     SITE/catalogue.json
///     SITE/books/<identifier>/<language, or default>/pages/…
///     SITE/books/<identifier>/<language, or default>/<digest>.helpindex
///     SITE/books/<identifier>/<language, or default>/<digest>.exactmatch.plist
///
/// The names of indexes and lists follow from their contents and never come to mean anything else.
/// The catalogue is replaced last, in one step, and what the one before it named stays until the
/// next change: whoever reads during a publication gets one edition or the other. What would not
/// change is not touched.
/// Thread-safety: confined to one thread; one site is written by one process at a time.
class Publishing {
 public:
  /// `site` need not be there yet.
  Publishing(std::string site, Console& console) : _site(std::move(site)), _console(console) {}

  /// Publishes the book in `folder` in each of its languages (see editionsOfFolder) and says so on
  /// the console. Other books on the site stay. False, with the reason on the console and the
  /// catalogue as it was, for what cannot be published.
  bool publish(const std::string& folder, const std::optional<std::string>& bookID,
               const std::string& language);

 private:
  struct Published;
  bool _readCatalogue(RNXCatalogue& catalogue);
  bool _publishEdition(const BookEdition& edition, std::vector<Published>& published);
  std::optional<platform::Data> _index(const BookEdition& edition, const std::string& pages,
                                       size_t& pageCount);
  bool _replaceCatalogue(const RNXCatalogue& former, std::vector<Published>& published);
  bool _fail(const std::string& what, const std::string& reason);

  const std::string _site;
  Console& _console;
};

}  // namespace zeb

// Books of publishers on web servers: entered into the catalogue, and taken out of it.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/URL.h"
#include "zebd/Catalogue.h"

struct RNXCatalogue;

namespace zebd {

/// What could not be done for a book (or a folder, or an address), and why.
struct BookFailure {
  std::string what;
  std::string reason;

  friend bool operator==(const BookFailure&, const BookFailure&) = default;
};

/// Which books of a publisher somebody wants.
struct WantedBooks {
  /// Identifiers; empty for all.
  std::vector<std::string> bookIDs;
  /// Language tags, best first; empty for the user's own, whichever they are at the time.
  std::vector<std::string> languages;
};

/// The address of a publisher's catalogue as it is asked for; absent for what is no address of a
/// web server.
std::optional<platform::URL> addressOfCatalogue(const std::string& typed);

/// Enters books of the publisher's catalogue, which is at `address`, into this one, each in the
/// language that suits its reader best. An installed book of the same identifier whose kind allows
/// that (type 3) is renewed from the publisher from now on; any other is left alone, which is a
/// failure, as is a book that the publisher does not have. Returns the entries that were stored.
std::vector<CatalogueEntry> subscribe(const RNXCatalogue& published, const platform::URL& address,
                                      const WantedBooks& wanted, const Catalogue& catalogue,
                                      std::vector<BookFailure>& failures);

/// The entries that `name` stands for: a book of this identifier, or the books on servers that are
/// from the catalogue of this address. Installed books that are renewed from there lose only that,
/// and are told by `wasFound`.
std::vector<CatalogueEntry> unsubscribe(const std::string& name, const Catalogue& catalogue,
                                        bool& wasFound);

/// Has the entries of remote books say in which language each is now, in the catalogue, too: the
/// best of those that are here. Where one has changed, the plug-in of the next host looks at every
/// book anew: what it remembers is the former index.
void followLanguages(const Catalogue& catalogue, std::vector<CatalogueEntry>& entries);

/// Has the plug-in of the next host look at every book anew, which is when it asks servers: at
/// once, or (when due) when it has not done so for some hours and there are books that a server may
/// renew. Nothing is lost: indexes stay where they are.
void forgetKnownIndices();
void forgetKnownIndicesWhenDue(const std::vector<CatalogueEntry>& entries);

}  // namespace zebd

// Books whose pages and indexes are on web servers.
#pragma once

#include <string>
#include <vector>

#include "zeb/CommandLine.h"
#include "zeb/Console.h"
#include "zebd/Catalogue.h"
#include "zebd/Installation.h"

namespace zeb {

using zebd::Catalogue;
using zebd::CatalogueEntry;
using zebd::Installation;

/// Enters the books of a publisher's catalogue into this one, each in the language that suits the
/// user best, and has their indexes fetched. An installed book of the same identifier whose kind
/// allows that (type 3) is renewed from the publisher from now on; any other is left alone and
/// counts as a failure.
ExitCode addBooks(const AddCommand& command, const Catalogue& catalogue,
                  const Installation& installation, const Waiting& waiting, Console& console);

/// Forgets books and deletes what was made or fetched for them; with a catalogue's address, all
/// books that are from there.
ExitCode removeBooks(const RemoveCommand& command, const Catalogue& catalogue,
                     const Installation& installation, Console& console);

/// Has all remote books looked for on their servers now, and what has changed fetched. Returns how
/// many there are.
size_t refreshRemoteBooks(const Catalogue& catalogue, const Installation& installation,
                          const Waiting& waiting, Console& console);

/// Has the plug-in of the next host look at every book anew, which is when it asks servers: at
/// once, or (when due) when it has not done so for some hours and there are books that a server may
/// renew. Nothing is lost: indexes stay where they are.
void forgetKnownIndices();
void forgetKnownIndicesWhenDue(const std::vector<CatalogueEntry>& entries);

}  // namespace zeb

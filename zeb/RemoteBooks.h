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

/// Has all remote books, and installed books that are renewed from servers, looked for there now,
/// and what has changed fetched. Returns how many remote books there are.
size_t refreshRemoteBooks(const Catalogue& catalogue, const Installation& installation,
                          const Waiting& waiting, Console& console);

/// Asks a server for a catalogue: what is wrong with the answer; absent when nothing is.
std::optional<std::string> problemOfCatalogue(const std::string& url, const Waiting& waiting);

}  // namespace zeb

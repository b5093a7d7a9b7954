// Brings the catalogue, and the indexes behind it, up to date with folders of help pages.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "platform/FileLock.h"
#include "zeb/CommandLine.h"
#include "zeb/Console.h"
#include "zebd/Catalogue.h"
#include "zebd/Installation.h"

namespace zeb {

using zebd::Catalogue;
using zebd::CatalogueEntry;
using zebd::Installation;

class HelpSearch;

/// What became of the books.
struct IndexingCounts {
  size_t indexed = 0;
  size_t unchanged = 0;
  size_t forgotten = 0;
  size_t failed = 0;
  /// In the catalogue, to be indexed by a later command.
  size_t left = 0;
};

/// Has the catalogue to itself among programs, as long as the result lives; waits for that, saying
/// so on the console. Absent where no lock can be had.
std::optional<platform::FileLock> lockCatalogue(const Catalogue& catalogue, Console& console);

/// One bringing up to date. Runs the main loop; confined to the main thread.
class Update {
 public:
  /// All of these must outlive the update.
  Update(const Catalogue& catalogue, const Waiting& waiting, Console& console)
      : _catalogue(catalogue), _waiting(waiting), _console(console) {}

  /// Enters `books` into the catalogue and has those indexed that are new or have changed, or all
  /// with `evenIfUnchanged`, and forgets those that are `gone`, saying on the console what happens.
  /// An index that is out of date is removed before the catalogue says otherwise, so that a run
  /// that is cut short costs time only. To be called once.
  IndexingCounts run(const std::vector<CatalogueEntry>& books,
                     const std::vector<CatalogueEntry>& gone, const Installation& installation,
                     bool evenIfUnchanged);

 private:
  bool _isUpToDate(const CatalogueEntry& entry) const;
  void _removeOldIndexes(HelpSearch& search, const std::vector<CatalogueEntry>& gone);
  std::vector<std::string> _storeEntries();
  void _makeIndexes(HelpSearch& search, const std::vector<std::string>& bookIDs);
  void _tellIndexed(const std::string& bookID);

  const Catalogue& _catalogue;
  const Waiting& _waiting;
  Console& _console;
  std::vector<CatalogueEntry> _changed;
  IndexingCounts _counts;
};

}  // namespace zeb

// What keeps the pages of books from being found, book by book.
#pragma once

#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "zeb/CommandLine.h"
#include "zeb/Finding.h"
#include "zebd/Catalogue.h"

namespace zeb {

/// Looks at the books of the catalogue and of the computer: folders, pages, indexes, and whether
/// books that are there are on the list. Reads every page's first bytes and every index whole;
/// changes nothing. Confined to the main thread.
class BookExamination {
 public:
  /// Told of each book before it is looked at.
  using Progress = std::function<void(std::string_view bookID)>;

  BookExamination(const zebd::Catalogue& catalogue, Progress progress)
      : _catalogue(catalogue), _progress(std::move(progress)) {}

  /// Of the books only these; all where the list is empty.
  std::vector<Finding> run(const std::vector<std::string>& bookIDs);

  /// How many books of the catalogue were looked at.
  size_t count() const { return _count; }

 private:
  struct PassedOver {
    std::string folder;
    std::string reason;
  };

  void _lookForBooks();
  void _examinePlaces();
  void _examineEntry(const zebd::CatalogueEntry& entry);
  void _examineFolder(const zebd::CatalogueEntry& entry);
  void _examineLanguage(const zebd::CatalogueEntry& entry);
  void _examineIndex(const zebd::CatalogueEntry& entry);
  void _examineUnlisted(const zebd::CatalogueEntry& entry);
  void _examinePassedOver(const PassedOver& folder);
  void _examineUnknown(const std::string& bookID);
  void _add(std::string name, const zebd::CatalogueEntry& entry, std::string path, std::string text,
            std::string advice);

  const zebd::Catalogue& _catalogue;
  const Progress _progress;
  /// What is there now, by identifier.
  std::map<std::string, zebd::CatalogueEntry> _there;
  std::vector<PassedOver> _passedOver;
  std::vector<Finding> _findings;
  size_t _count = 0;
};

}  // namespace zeb

#include "zeb/Scan.h"

#include <fmt/format.h>

#include <ostream>
#include <string>
#include <vector>

#include "platform/Environment.h"
#include "platform/Files.h"
#include "zeb/Indexing.h"
#include "zeb/Paths.h"
#include "zeb/RemoteBooks.h"
#include "zebd/BookDiscovery.h"

namespace zeb {

namespace {

/// The data folders that the command is about.
std::vector<std::string> dataFoldersOf(const ScanCommand& command) {
  const std::string root = absolutePath(command.root);
  if (root == "/") {
    return platform::Environment::current()->dataDirectories;
  }
  return {platform::stringByAppendingPathComponent(root, "usr/share")};
}

}  // namespace

ExitCode scan(const ScanCommand& command, const Catalogue& catalogue,
              const Installation& installation, const Waiting& waiting, Console& console,
              int verbosity) {
  zebd::BookDiscovery books([&](const std::string& folder, const std::string& reason) {
    if (verbosity > 0) {
      console.note(fmt::format("passed over {}: {}", folder, reason));
    }
  });
  size_t brokenCount = 0;
  for (const std::string& folder : command.folders) {
    std::string reason;
    const std::string path = absolutePath(folder);
    if (!books.add(path, std::nullopt, {}, reason)) {
      console.error(fmt::format("{}: {}", path, reason));
      ++brokenCount;
    }
  }
  if (command.installedBooks) {
    console.progress("looking for books");
    books.addInstalled(dataFoldersOf(command),
                       command.languages.empty()
                           ? platform::Environment::current()->preferredLanguages
                           : command.languages);
  }
  const std::vector<zebd::CatalogueEntry> gone = books.addKnown(catalogue);

  const IndexingCounts counts =
      Update(catalogue, waiting, console)
          .run(books.books(), gone, installation, command.evenIfUnchanged);
  const size_t failedCount = counts.failed + brokenCount;
  console.clearProgress();
  console.out() << fmt::format("{} indexed, {} unchanged, {} forgotten, {} failed", counts.indexed,
                               counts.unchanged, counts.forgotten, failedCount);
  if (const size_t remoteCount = refreshRemoteBooks(catalogue, installation, waiting, console);
      remoteCount > 0) {
    console.out() << fmt::format(", {} on servers", remoteCount);
  }
  if (counts.left > 0) {
    console.out() << fmt::format(", {} still to be indexed", counts.left);
  }
  console.out() << '\n';
  return failedCount == 0 ? ExitCode::success : ExitCode::failure;
}

}  // namespace zeb

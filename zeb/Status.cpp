#include "zeb/Status.h"

#include <fmt/format.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <ostream>
#include <utility>

#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "platform/Strings.h"
#include "zeb/IndexingTools.h"

namespace zeb {

namespace {

using JSON = nlohmann::ordered_json;

std::string_view nameOfOrigin(IndexOrigin origin) {
  switch (origin) {
    case IndexOrigin::book:
      return "book";
    case IndexOrigin::generated:
      return "generated";
    case IndexOrigin::fetched:
      return "fetched";
    case IndexOrigin::none:
      break;
  }
  return "none";
}

std::string_view descriptionOfOrigin(IndexOrigin origin) {
  switch (origin) {
    case IndexOrigin::book:
      return "came with the book";
    case IndexOrigin::generated:
      return "made on this computer";
    case IndexOrigin::fetched:
      return "fetched from a server";
    case IndexOrigin::none:
      break;
  }
  return "not indexed yet";
}

std::string counted(uint64_t count, std::string_view one, std::string_view several) {
  return count == 1 ? fmt::format("1 {}", one) : fmt::format("{} {}", count, several);
}

/// As somebody would say it.
std::string spanOfTime(platform::Seconds span) {
  const auto seconds = static_cast<uint64_t>(std::max(span.count(), 0.0));
  if (seconds < 120) {
    return counted(seconds, "second", "seconds");
  }
  return seconds < 7200 ? counted(seconds / 60, "minute", "minutes")
                        : counted(seconds / 3600, "hour", "hours");
}

std::string descriptionOfDaemon(const StatusReport& report) {
  if (report.daemon) {
    return fmt::format("runs for {} (process {}, version {}), watches {}",
                       spanOfTime(report.daemon->running), report.daemon->process,
                       report.daemon->version,
                       counted(report.daemon->watchedFolderCount, "folder", "folders"));
  }
  return report.canHaveDaemon ? "does not run; it starts when it is needed"
                              : "there is none; commands do the work by themselves";
}

std::string descriptionOfWork(const StatusReport& report) {
  std::vector<std::string> work;
  if (report.daemon && report.daemon->isScanning) {
    work.emplace_back("looking for books");
  }
  if (report.daemon && report.daemon->searchCount > 0) {
    work.push_back(counted(report.daemon->searchCount, "search", "searches"));
  }
  if (report.indexingToolCount > 0) {
    work.push_back(
        counted(report.indexingToolCount, "book is being indexed", "books are being indexed"));
  }
  if (report.buildingModelCount > 0) {
    work.push_back(
        counted(report.buildingModelCount, "model is being built", "models are being built"));
  }
  if (report.daemon && report.daemon->guardCount > 0) {
    work.push_back(counted(static_cast<uint64_t>(report.daemon->guardCount),
                           "piece of background work", "pieces of background work"));
  }
  return work.empty() ? "nothing" : fmt::format("{}", fmt::join(work, ", "));
}

size_t indexedCount(const StatusReport& report) {
  return static_cast<size_t>(
      std::count_if(report.books.begin(), report.books.end(),
                    [](const ListedBook& book) { return book.indexPath.has_value(); }));
}

}  // namespace

IndexOrigin originOfIndex(const ListedBook& book) {
  if (!book.indexPath) {
    return IndexOrigin::none;
  }
  const std::optional<std::string> root = ZEBGeneratedRoot();
  if (!root || !book.indexPath->starts_with(*root + "/")) {
    return IndexOrigin::book;
  }
  return book.entry.catalogueURL ? IndexOrigin::fetched : IndexOrigin::generated;
}

StatusReport statusReport(std::vector<ListedBook> books, const DaemonClient* daemon) {
  StatusReport report;
  report.books = std::move(books);
  for (const ListedModel& model : zebd::savedModels()) {
    ++report.modelCount;
    report.buildingModelCount += model.isBeingBuilt ? 1 : 0;
  }
  report.indexingToolCount = runningIndexingToolCount();
  report.canHaveDaemon = daemon != nullptr;
  if (daemon != nullptr && daemon->isRunning()) {
    report.daemon = daemon->status();
  }
  return report;
}

void printStatus(const StatusReport& report, Console& console) {
  size_t idWidth = 0;
  size_t languageWidth = 0;
  size_t originWidth = 0;
  for (const ListedBook& book : report.books) {
    idWidth = std::max(idWidth, singleLine(book.entry.bookID).size());
    languageWidth = std::max(languageWidth, singleLine(book.entry.language).size());
    originWidth = std::max(originWidth, descriptionOfOrigin(originOfIndex(book)).size());
  }
  for (const ListedBook& book : report.books) {
    const IndexOrigin origin = originOfIndex(book);
    console.out() << console.styled(Style::book,
                                    fmt::format("{:<{}}", singleLine(book.entry.bookID), idWidth))
                  << fmt::format("  {:<{}}  ", singleLine(book.entry.language), languageWidth)
                  << console.styled(origin == IndexOrigin::none ? Style::error : Style::label,
                                    fmt::format("{:<{}}", descriptionOfOrigin(origin), originWidth))
                  << "  " << console.styled(Style::title, singleLine(book.entry.title)) << '\n';
  }
  if (!report.books.empty()) {
    console.out() << '\n';
  }
  const auto line = [&](std::string_view label, const std::string& what) {
    console.out() << console.styled(Style::label, fmt::format("{:<8}", label)) << what << '\n';
  };
  line("books", fmt::format("{}, {} indexed", report.books.size(), indexedCount(report)));
  line("models", std::to_string(report.modelCount));
  line("daemon", singleLine(descriptionOfDaemon(report)));
  line("now", descriptionOfWork(report));
}

void printStatusAsJSON(const StatusReport& report, Console& console) {
  JSON books = JSON::array();
  for (const ListedBook& book : report.books) {
    JSON entry;
    entry["id"] = platform::stringByRepairingUTF8(book.entry.bookID);
    entry["title"] = platform::stringByRepairingUTF8(book.entry.title);
    entry["language"] = platform::stringByRepairingUTF8(book.entry.language);
    entry["origin"] = nameOfOrigin(originOfIndex(book));
    if (book.indexPath) {
      entry["index"] = platform::stringByRepairingUTF8(*book.indexPath);
    }
    books.push_back(std::move(entry));
  }
  JSON object;
  object["books"] = std::move(books);
  object["models"] = {{"count", report.modelCount}, {"building", report.buildingModelCount}};
  object["indexingTools"] = report.indexingToolCount;
  object["daemon"] = nullptr;
  if (report.daemon) {
    object["daemon"] = {{"process", report.daemon->process},
                        {"version", platform::stringByRepairingUTF8(report.daemon->version)},
                        {"seconds", report.daemon->running.count()},
                        {"searches", report.daemon->searchCount},
                        {"watchedFolders", report.daemon->watchedFolderCount},
                        {"scanning", report.daemon->isScanning},
                        {"backgroundWork", report.daemon->guardCount}};
  }
  console.out() << object.dump(2, ' ', false, JSON::error_handler_t::replace) << '\n';
}

}  // namespace zeb

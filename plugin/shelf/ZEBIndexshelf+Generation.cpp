#include <algorithm>
#include <cerrno>
#include <exception>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Processes.h"
#include "platform/UserDefaults.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace {

constexpr const char* toolPath = "/usr/bin/bvmake";
constexpr const char* toolName = "bvmake";
// Far more than the tool tells apart and about what a command line holds: a setting is no way to
// fill memory.
constexpr int64_t maximumVerbosity = 100'000;

std::vector<std::string> toolArguments(const ZEBHelpBook& book, const std::string& outputPath,
                                       bool onlyGenerateLUXIndex) {
  std::vector<std::string> arguments = {"--create", "--anchors", "--generate-summaries",
                                        "--file",   outputPath,  "--min-term-length",
                                        "3"};
  if (onlyGenerateLUXIndex) {
    arguments.emplace_back("--append-LUX-only");
  }
  arguments.emplace_back("--lowered-priority");
  const int64_t level = platform::Environment::current()->userDefaults->integerForKey("LogLevel");
  for (int64_t i = 0; i < std::min(level, maximumVerbosity); ++i) {
    arguments.emplace_back("--verbose");
  }
  arguments.push_back(localizedDocumentRootPath(book));
  return arguments;
}

/// Above 0 when somebody else's run of the tool is writing this file, or when the processes cannot
/// be listed; else 0 or -1.
int statusOfOtherRuns(const std::string& outputPath) {
  const auto table = platform::Environment::current()->processTable;
  std::vector<platform::ProcessEntry> processes;
  int failure = table->readProcesses(processes);
  while (failure == ENOMEM) {
    failure = table->readProcesses(processes);
  }
  if (failure != 0) {
    return failure;
  }
  for (const platform::ProcessEntry& process : processes) {
    if (process.commandName == toolName && process.processID != 0) {
      // Only the first run of the tool is looked at.
      return pidHasArgs(process.processID, {"--file", outputPath}, 2);
    }
  }
  return 0;
}

}  // namespace

std::shared_ptr<ZEBIndex> ZEBIndexshelf::_generateIndexForBook(
    const std::shared_ptr<ZEBHelpBook>& book, const std::optional<std::string>& atPath,
    bool onlyGenerateLUXIndex) {
  const auto environment = platform::Environment::current();
  const std::string folder =
      atPath ? platform::stringByDeletingLastPathComponent(*atPath) : std::string();
  if (folder.empty()) {
    ZEBLog(1, "Error creating directory at path <%@>: %@");
    return nullptr;
  }
  if (const auto error = environment->files->createDirectoryWithParents(folder)) {
    ZEBLog(1, "Error creating directory at path <%@>: %@", folder, *error);
    return nullptr;
  }
  platform::removeAbandonedFiles(folder);
  ZEBLog(3, "Writing generated index out to path: %@", *atPath);
  const std::vector<std::string> arguments = toolArguments(*book, *atPath, onlyGenerateLUXIndex);
  if (statusOfOtherRuns(*atPath) > 0) {
    return nullptr;
  }
  try {
    const int status = environment->processLauncher->launchAndWait(toolPath, arguments);
    if (status != 0) {
      ZEBLog(0, "Task at %@ failed with error %d. Arguments %@", toolPath, status, arguments);
      return nullptr;
    }
  } catch (const std::exception& exception) {
    ZEBLog(0, "Task at %@ threw exception: %@. Arguments %@", toolPath, exception, arguments);
    return nullptr;
  }
  std::shared_ptr<ZEBIndex> record = ZEBIndex::indexWithPath(*atPath);
  if (record) {
    record->setBookID(book->bookID());
    record->setLoadedFromGeneratedCache(true);
  }
  return record;
}

std::string localizedDocumentRootPath(const ZEBHelpBook& book) {
  if (book.type() != ZEBHelpBookType2 && book.type() != ZEBHelpBookType3) {
    return book.path();
  }
  const std::optional<std::string> resources = book.resourcesRootPath();
  if (!resources) {
    return book.path();
  }
  const std::string localization = book.localization();
  if (localization.empty()) {
    return *resources;
  }
  const std::string localized = platform::stringByAppendingPathComponent(
      *resources, platform::stringByAppendingPathExtension(localization, "lproj"));
  bool isDirectory = false;
  const auto files = platform::Environment::current()->files;
  const bool exists = files->fileExistsAtPath(localized, &isDirectory) && isDirectory;
  return exists ? localized : *resources;
}

int pidHasArgs(int processID, const std::vector<std::string>& strings, size_t count) {
  constexpr int matched = 1;
  constexpr int unmatched = -1;
  const auto environment = platform::Environment::current();
  const std::optional<size_t> maximum = environment->processTable->maximumArgumentSize();
  if (!maximum) {
    return unmatched;
  }
  const auto area = environment->processTable->argumentsOfProcess(processID);
  if (!area) {
    return unmatched;
  }
  std::string_view rest = area->view().substr(0, *maximum);
  const size_t endOfName = rest.find('\0');
  if (endOfName == std::string_view::npos) {
    return unmatched;
  }
  rest.remove_prefix(endOfName + 1);
  size_t matching = 0;
  for (size_t end = rest.find('\0'); end != std::string_view::npos; end = rest.find('\0')) {
    const std::string_view argument = rest.substr(0, end);
    rest.remove_prefix(end + 1);
    environment->standardOutput(std::string(argument) + "\n");
    if (matching >= strings.size() || argument != strings[matching]) {
      matching = 0;
    } else if (++matching == count) {
      return matched;
    }
  }
  return unmatched;
}

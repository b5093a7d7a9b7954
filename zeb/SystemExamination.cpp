#include "zeb/SystemExamination.h"

#include <fmt/format.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <string_view>
#include <system_error>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Bundle.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/Files.h"
#include "platform/Processes.h"
#include "platform/PropertyList.h"

namespace zeb {

namespace {

constexpr const char* toolPath = "/usr/bin/bvmake";
constexpr const char* installAdvice = "install the system again";
/// Less than any index, model or list of books may need.
constexpr unsigned long long leastFreeBytes = 16ULL << 20;

std::shared_ptr<platform::FileManager> files() { return platform::Environment::current()->files; }

bool isFolder(const std::string& path) {
  bool isDirectory = false;
  return files()->fileExistsAtPath(path, &isDirectory) && isDirectory;
}

void examinePlugin(const std::string& bundlePath, std::vector<Finding>& findings) {
  const auto bundle = platform::Bundle::bundleWithPath(bundlePath);
  const auto code = bundle == nullptr ? std::nullopt : bundle->executablePath();
  std::string text;
  if (bundle == nullptr) {
    text = "the plug-in is not there";
  } else if (!code || !files()->fileExistsAtPath(*code)) {
    text = "the plug-in has no code";
  } else if (!files()->contentsMappedAtPath(*code)) {
    text = "the code of the plug-in cannot be read";
  }
  if (!text.empty()) {
    findings.push_back({"plug-in", std::nullopt, bundlePath, text, installAdvice});
  }
}

/// What is wrong with the tool; empty when nothing is.
std::string problemOfTool(const std::string& path) {
  bool isDirectory = false;
  if (!files()->fileExistsAtPath(path, &isDirectory) || isDirectory) {
    return "the indexing tool is not there";
  }
  if (::access(path.c_str(), X_OK) != 0) {
    return "the indexing tool may not be started";
  }
  try {
    // Quietly: it would say its version here.
    const int status = platform::systemProcessLauncher()->launchAndWait(
        "/bin/sh", {"-c", "exec \"$0\" --version >/dev/null 2>&1", path});
    return status == 0 ? std::string()
                       : fmt::format("the indexing tool cannot be started (status {})", status);
  } catch (const platform::Exception& exception) {
    return fmt::format("the indexing tool cannot be started: {}", exception.reason());
  }
}

void examineTool(const std::string& path, std::vector<Finding>& findings) {
  if (const std::string problem = problemOfTool(path); !problem.empty()) {
    findings.push_back({"tool", std::nullopt, path, problem, installAdvice});
  }
}

/// What is wrong with the folder, which need not be there yet; empty when nothing is.
std::string problemOfFolder(const std::string& folder) {
  std::string there = folder;
  while (there.size() > 1 && !files()->fileExistsAtPath(there)) {
    there = platform::stringByDeletingLastPathComponent(there);
  }
  if (!isFolder(there)) {
    return fmt::format("{} is no folder", there);
  }
  if (::access(there.c_str(), W_OK | X_OK) != 0) {
    return fmt::format("nothing can be written to {} ({})", there,
                       std::generic_category().message(errno));
  }
  struct statvfs state = {};
  if (::statvfs(there.c_str(), &state) == 0) {
    const unsigned long long free = state.f_bavail * 1ULL * state.f_frsize;
    if (state.f_blocks > 0 && free < leastFreeBytes) {
      return fmt::format("there is little room left for {} ({} kB)", there, free / 1000);
    }
  }
  return {};
}

void examineFolders(const zebd::Catalogue& catalogue, std::vector<Finding>& findings) {
  constexpr const char* advice =
      "make room, or see to it that the folder is yours; or choose another with --cache-dir";
  std::vector<std::string> folders = {catalogue.folder()};
  if (const auto caches = platform::Environment::current()->cachesDirectory) {
    const std::string helpCaches =
        platform::stringByAppendingPathComponent(*caches, ZEBDaemonBundleID);
    folders.push_back(helpCaches);
    folders.push_back(
        platform::stringByAppendingPathComponent(helpCaches, ZEBGeneratedIndexDirectory));
  }
  std::string told;
  for (const std::string& folder : folders) {
    std::string problem = problemOfFolder(folder);
    // Most often it is one and the same folder above all of them.
    if (!problem.empty() && std::exchange(told, problem) != problem) {
      findings.push_back({"cache", std::nullopt, folder, std::move(problem), advice});
    }
  }
}

void examineEntries(const zebd::Catalogue& catalogue, std::vector<Finding>& findings) {
  constexpr std::string_view suffix = ".plist";
  const auto names = files()->namesInDirectory(catalogue.folder());
  for (const std::string& name : names.value_or(std::vector<std::string>())) {
    if (name.ends_with(suffix) && !name.starts_with('.') &&
        !catalogue.entry(name.substr(0, name.size() - suffix.size()))) {
      findings.push_back({"damaged-entry", std::nullopt,
                          platform::stringByAppendingPathComponent(catalogue.folder(), name),
                          "the file does not describe a book",
                          "remove it; 'zeb scan' enters the books that are there"});
    }
  }
}

void examineSettings(const std::optional<std::string>& path, std::vector<Finding>& findings) {
  if (path && files()->fileExistsAtPath(*path) && !platform::dictionaryWithContentsOfFile(*path)) {
    findings.push_back({"damaged-settings", std::nullopt, *path,
                        "the settings cannot be read as a property list, and none of them counts",
                        "correct the file, or remove it"});
  }
}

}  // namespace

std::vector<Finding> examineSystem(const zebd::Catalogue& catalogue,
                                   const zebd::Installation& installation,
                                   const std::optional<std::string>& settingsPath) {
  std::vector<Finding> findings;
  examinePlugin(installation.pluginBundlePath, findings);
  examineTool(installation.indexingToolPath.empty() ? toolPath : installation.indexingToolPath,
              findings);
  examineFolders(catalogue, findings);
  examineEntries(catalogue, findings);
  examineSettings(settingsPath, findings);
  return findings;
}

}  // namespace zeb

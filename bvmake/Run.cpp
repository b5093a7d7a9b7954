#include "bvmake/Run.h"

#include <fmt/format.h>

#include <filesystem>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "SearchKit/IndexWriter.h"
#include "bvmake/AnchorTable.h"
#include "bvmake/FolderWalker.h"
#include "bvmake/HelpIndexFile.h"
#include "bvmake/PageReader.h"
#include "bvmake/Priority.h"
#include "bvmake/Report.h"
#include "bvmake/Summary.h"
#include "platform/Environment.h"
#include "platform/Exception.h"

namespace bvmake {

namespace {

/// "page" for "/a/page.html": how a page is called that has no other name.
std::string nameFromPath(const std::string& path) {
  const std::string name = platform::lastPathComponent(path);
  return name.substr(0, name.rfind('.'));
}

searchkit::Document documentFromPage(const std::string& path, Page page, std::string abstract) {
  searchkit::Document document;
  document.path = path;
  document.title = page.title.empty() ? nameFromPath(path) : std::move(page.title);
  document.headings = std::move(page.headings);
  document.headings.insert(document.headings.end(), page.keywords.begin(), page.keywords.end());
  if (!page.description.empty()) {
    document.body.push_back(std::move(page.description));
  }
  for (TextBlock& block : page.body) {
    document.body.push_back(std::move(block.text));
  }
  if (!abstract.empty()) {
    document.abstract = std::move(abstract);
  }
  return document;
}

class Run {
 public:
  Run(const CreateOptions& options, Report& report)
      : _options(options),
        _report(report),
        _files(platform::Environment::current()->files),
        _writer({options.minimumTermLength}) {}

  Outcome run() {
    if (_options.appendLUXOnly) {
      return _fail("--append-LUX-only: this version has no semantic data to append");
    }
    if (_options.loweredPriority) {
      if (const auto error = lowerPriority()) {
        _report.warning(error->description);
      }
    }
    platform::Error error;
    const auto pages = findPages(_options.folder, _report, &error);
    if (!pages) {
      return _fail(fmt::format("cannot index the folder {}", error.description));
    }
    // Now rather than after minutes of work.
    if (!_prepareOutput()) {
      return _outcome;
    }
    for (const FoundPage& page : *pages) {
      _addFile(page);
    }
    return _write();
  }

 private:
  Outcome _fail(std::string_view why) {
    _report.error(why);
    _outcome.exitCode = ExitCode::failure;
    return _outcome;
  }

  bool _prepareOutput() {
    // Renaming over it would do away with a device or a pipe.
    std::error_code ignored;
    const std::filesystem::file_status former =
        std::filesystem::status(_options.outputPath, ignored);
    if (std::filesystem::exists(former) && !std::filesystem::is_regular_file(former)) {
      _fail(fmt::format("cannot write {}: what is there is no regular file", _options.outputPath));
      return false;
    }
    const std::string folder = platform::stringByDeletingLastPathComponent(_options.outputPath);
    if (!folder.empty()) {
      if (const auto error = _files->createDirectoryWithParents(folder)) {
        _fail(fmt::format("cannot write {}: {}", _options.outputPath, error->description));
        return false;
      }
    }
    return true;
  }

  void _skip(const FoundPage& found, std::string_view why) {
    _report.warning(fmt::format("{}: {}; the page is left out", found.file, why));
    ++_outcome.skippedCount;
  }

  void _addFile(const FoundPage& found) {
    try {
      platform::Error error;
      const auto bytes = _files->contentsAtPath(found.file, &error);
      if (!bytes) {
        _skip(found, error.description);
        return;
      }
      _outcome.inputBytes += bytes->length();
      std::optional<Page> page = readPage(found.kind, bytes->view(), &error);
      if (!page) {
        _skip(found, error.description);
        return;
      }
      _addPage(found, std::move(*page));
    } catch (const std::exception& exception) {
      _skip(found, exception.what());
    }
  }

  void _addPage(const FoundPage& found, Page page) {
    if (page.excludedFromSearch) {
      _report.progress(2, fmt::format("{}: asks not to be indexed", found.path));
      ++_outcome.leftOutCount;
      return;
    }
    if (!page.hasText() && page.anchors.empty()) {
      _report.progress(2, fmt::format("{}: nothing in it", found.path));
      ++_outcome.leftOutCount;
      return;
    }
    std::string abstract = page.description;
    if (abstract.empty() && _options.generateSummaries) {
      abstract = _summarizer.summary(page);
    }
    const bool hasAbstract = !abstract.empty();
    const std::vector<std::string> anchors = std::move(page.anchors);
    _writer.add(documentFromPage(found.path, std::move(page), std::move(abstract)));
    if (_options.anchors) {
      _anchors.addPage(found.path, anchors);
    }
    _outcome.abstractCount += hasAbstract ? 1 : 0;
    ++_outcome.pageCount;
    if (_report.wants(2)) {
      _report.progress(2, found.path);
    }
  }

  Outcome _write() {
    if (_outcome.pageCount == 0) {
      _report.warning(fmt::format("nothing to index in {}; the index is empty", _options.folder));
    }
    _outcome.anchorCount = _anchors.count();
    const platform::Data file =
        helpIndexFile(_writer.finish(), _options.anchors ? _anchors.value() : platform::Value());
    if (const auto error = _files->writeAtomically(_options.outputPath, file)) {
      return _fail(fmt::format("cannot write {}: {}", _options.outputPath, error->description));
    }
    _outcome.outputBytes = file.length();
    _report.progress(
        1, fmt::format("{}: {} pages ({} skipped, {} left out), {} anchors, {} bytes",
                       _options.outputPath, _outcome.pageCount, _outcome.skippedCount,
                       _outcome.leftOutCount, _outcome.anchorCount, _outcome.outputBytes));
    return _outcome;
  }

  const CreateOptions& _options;
  Report& _report;
  std::shared_ptr<platform::FileManager> _files;
  Outcome _outcome;
  searchkit::IndexWriter _writer;
  AnchorTable _anchors;
  Summarizer _summarizer;
};

}  // namespace

Outcome run(const CreateOptions& options, Report& report) {
  try {
    return Run(options, report).run();
  } catch (const std::exception& exception) {
    report.error(exception.what());
    Outcome outcome;
    outcome.exitCode = ExitCode::failure;
    return outcome;
  }
}

}  // namespace bvmake

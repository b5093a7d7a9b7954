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
#include "bvmake/SemanticData.h"
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

searchkit::Document documentFromPage(const std::string& path, std::string title, Page page,
                                     std::string abstract) {
  searchkit::Document document;
  document.path = path;
  document.title = std::move(title);
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
        _writer({options.minimumTermLength}),
        _semanticData(options.folder, options.language) {}

  Outcome run() {
    if (!_options.language.empty() && !SemanticData::isLanguage(_options.language)) {
      return _fail(fmt::format("no language that is known here: {}", _options.language));
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
    if (_options.appendLUXOnly && !readHelpIndexFile(_options.outputPath, &error)) {
      return _failToAppend(error);
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

  Outcome _failToAppend(const platform::Error& error) {
    return _fail(
        fmt::format("cannot add semantic data to {}: {}", _options.outputPath, error.description));
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
    if (const auto error = _makeOutputFolder()) {
      _fail(fmt::format("cannot write {}: {}", _options.outputPath, error->description));
      return false;
    }
    return true;
  }

  std::optional<platform::Error> _makeOutputFolder() {
    const std::string folder = platform::stringByDeletingLastPathComponent(_options.outputPath);
    return folder.empty() ? std::nullopt : _files->createDirectoryWithParents(folder);
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
    if (!page.hasText() && page.anchors.empty()) {
      _report.progress(2, fmt::format("{}: nothing in it", found.path));
      ++_outcome.leftOutCount;
      return;
    }
    std::string title = page.title.empty() ? nameFromPath(found.path) : page.title;
    if (page.excludedFromSearch) {
      // Its words are those of the book all the same, and say how the book uses them.
      _semanticData.addPage(found.path, title, page.description, page);
      _report.progress(2, fmt::format("{}: asks not to be indexed", found.path));
      ++_outcome.leftOutCount;
      return;
    }
    std::string abstract = page.description;
    if (abstract.empty() && _options.generateSummaries) {
      abstract = _summarizer.summary(page);
    }
    const bool hasAbstract = !abstract.empty();
    _semanticData.addPage(found.path, title, abstract, page);
    if (!_options.appendLUXOnly) {
      const std::vector<std::string> anchors = std::move(page.anchors);
      _writer.add(
          documentFromPage(found.path, std::move(title), std::move(page), std::move(abstract)));
      if (_options.anchors) {
        _anchors.addPage(found.path, anchors);
      }
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
    platform::Error why;
    const std::optional<platform::Data> file = _file(&why);
    if (!file) {
      return _failToAppend(why);
    }
    // Somebody who removes an index removes its folder, and may do so while the next is being made.
    if (auto error = _makeOutputFolder();
        error || (error = _files->writeAtomically(_options.outputPath, *file))) {
      return _fail(fmt::format("cannot write {}: {}", _options.outputPath, error->description));
    }
    _outcome.outputBytes = file->length();
    _report.progress(
        1, fmt::format("{}: {} pages ({} skipped, {} left out), {} anchors, language {}, {} bytes, "
                       "of these {} of semantic data",
                       _options.outputPath, _outcome.pageCount, _outcome.skippedCount,
                       _outcome.leftOutCount, _outcome.anchorCount, _semanticData.languageTag(),
                       _outcome.outputBytes, _outcome.semanticBytes));
    return _outcome;
  }

  /// The bytes to write; absent, with `error` set, where the file to add to cannot be read.
  std::optional<platform::Data> _file(platform::Error* error) {
    const platform::Data semanticData = _semanticData.finish();
    _outcome.semanticBytes = semanticData.length();
    if (!_options.appendLUXOnly) {
      return helpIndexFile(_writer.finish(), semanticData,
                           _options.anchors ? _anchors.value() : platform::Value());
    }
    const auto former = _files->contentsMappedAtPath(_options.outputPath, error);
    return former ? helpIndexFileWithLUXIndexData(*former, semanticData, error) : std::nullopt;
  }

  const CreateOptions& _options;
  Report& _report;
  std::shared_ptr<platform::FileManager> _files;
  Outcome _outcome;
  searchkit::IndexWriter _writer;
  SemanticData _semanticData;
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

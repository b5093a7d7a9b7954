#include "bvmake/Run.h"

#include <fmt/format.h>
#include <malloc.h>

#include <algorithm>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "bvmake/AnchorTable.h"
#include "bvmake/FolderWalker.h"
#include "bvmake/HelpIndexFile.h"
#include "bvmake/IndexShard.h"
#include "bvmake/OrderedWork.h"
#include "bvmake/PreparedFile.h"
#include "bvmake/Priority.h"
#include "bvmake/Report.h"
#include "bvmake/SemanticData.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/Exception.h"

namespace bvmake {

namespace {

/// Files being read at once, in bytes, whatever the number of workers. What a page takes while it
/// is read is some times the size of its file.
constexpr uint64_t bytesInFlight = uint64_t{32} << 20;

constexpr int highestVerbosity = 3;

size_t workerCount(const CreateOptions& options) {
  if (options.jobs > 0) {
    return std::min(options.jobs, maximumJobs);
  }
  // Whoever asks to be given way to is not to meet this program on every processor; and the help
  // daemon, which asks for it, runs several of these at once.
  return options.loweredPriority
             ? 1
             : static_cast<size_t>(platform::Environment::current()->processorCount());
}

/// What threads have freed lies between what is still needed, and malloc keeps it: as much as a
/// fifth of the peak.
void giveFreeMemoryBack() { malloc_trim(0); }

class Run {
 public:
  Run(const CreateOptions& options, Report& report)
      : _options(options),
        _report(report),
        _files(platform::Environment::current()->files),
        _workerCount(workerCount(options)) {}

  Outcome run() {
    if (!_options.language.empty() && !isLanguage(_options.language)) {
      return _fail(fmt::format("no language that is known here: {}", _options.language));
    }
    if (_options.loweredPriority) {
      if (const auto error = lowerPriority()) {
        _report.warning(error->description);
      }
    }
    platform::Error error;
    auto pages = findPages(_options.folder, _report, &error);
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
    _pages = std::move(*pages);
    for (size_t worker = 0; worker < _workerCount; ++worker) {
      _preparers.push_back(
          std::make_unique<FilePreparer>(_preparationOptions(), _options.folder, _files));
    }
    _tokenizer = tokenizerForBook(_options.folder, _options.language);
    if (_tokenizer == nullptr) {
      _findLanguage();
    }
    _addFiles();
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
    // What runs have left that were killed while they wrote this file.
    const std::string folder = platform::stringByDeletingLastPathComponent(_options.outputPath);
    platform::removeAbandonedFiles(folder.empty() ? "." : folder,
                                   platform::lastPathComponent(_options.outputPath));
    return true;
  }

  std::optional<platform::Error> _makeOutputFolder() {
    const std::string folder = platform::stringByDeletingLastPathComponent(_options.outputPath);
    return folder.empty() ? std::nullopt : _files->createDirectoryWithParents(folder);
  }

  PreparationOptions _preparationOptions() const {
    PreparationOptions options;
    options.generateSummaries = _options.generateSummaries;
    while (_report.wants(options.verbosity + 1) && options.verbosity < highestVerbosity) {
      ++options.verbosity;
    }
    return options;
  }

  /// Reads the first files ahead, until they have pages enough to tell. They are kept.
  void _findLanguage() {
    std::vector<const PreparedPage*> sample;
    uint64_t bytes = 0;
    while (sample.size() < languageSample && bytes < languageSampleBytes &&
           _prepared.size() < _pages.size()) {
      const size_t first = _prepared.size();
      size_t end = first;
      for (; end < _pages.size() && end - first < languageSample - sample.size() &&
             bytes < languageSampleBytes;
           ++end) {
        bytes += _pages[end].size;
      }
      _prepared.resize(end);
      OrderedWork<bool>::run(end - first, _limits(),
                             {[&](size_t piece) { return _pages[first + piece].size; },
                              [&](size_t piece, size_t worker) {
                                _prepared[first + piece] =
                                    _preparers[worker]->prepare(_pages[first + piece]);
                                return true;
                              },
                              {}});
      sample.clear();
      for (const PreparedFile& file : _prepared) {
        for (const PreparedPage& page : file.pages) {
          sample.push_back(&page);
        }
      }
    }
    sample.resize(std::min(sample.size(), languageSample));
    _tokenizer = tokenizerForPages(sample);
  }

  void _addFiles() {
    IndexShard::Options options;
    options.minimumTermLength = _options.minimumTermLength;
    options.semanticOnly = _options.appendLUXOnly;
    options.anchors = _options.anchors;
    for (size_t worker = 0; worker < _workerCount; ++worker) {
      _shards.push_back(std::make_unique<IndexShard>(options, _tokenizer));
    }
    OrderedWork<AddedFile>::run(
        _pages.size(), _limits(),
        {[this](size_t piece) { return _pages[piece].size; },
         [this](size_t piece, size_t worker) {
           PreparedFile file = piece < _prepared.size()
                                   ? std::exchange(_prepared[piece], PreparedFile())
                                   : _preparers[worker]->prepare(_pages[piece]);
           return _shards[worker]->add(std::move(file));
         },
         [this](size_t piece, const AddedFile& added) { _count(piece, added); }});
  }

  WorkLimits _limits() const { return {_workerCount, bytesInFlight}; }

  void _count(size_t piece, const AddedFile& added) {
    for (const Message& message : added.messages) {
      if (message.kind == Message::Kind::warning) {
        _report.warning(message.text);
      } else {
        _report.progress(message.verbosity, message.text);
      }
    }
    for (const PageAnchors& page : added.anchors) {
      _anchors.addPage(page.path, page.anchors);
    }
    _outcome.inputBytes += added.inputBytes;
    _outcome.pageCount += added.pageCount;
    _outcome.skippedCount += added.skippedCount;
    _outcome.leftOutCount += added.leftOutCount;
    _outcome.abstractCount += added.abstractCount;
    _report.filesDone(piece + 1, _pages.size());
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
                       _outcome.leftOutCount, _outcome.anchorCount, _tokenizer->languageTag(),
                       _outcome.outputBytes, _outcome.semanticBytes));
    return _outcome;
  }

  /// The bytes to write; absent, with `error` set, where the file to add to cannot be read.
  std::optional<platform::Data> _file(platform::Error* error) {
    giveFreeMemoryBack();
    const auto [keywords, semanticData] = _finishShards();
    giveFreeMemoryBack();
    _outcome.semanticBytes = semanticData.length();
    if (!_options.appendLUXOnly) {
      return helpIndexFile(
          keywords, semanticData,
          _options.anchors ? AnchorTable(std::move(_anchors)).value() : platform::Value());
    }
    const auto former = _files->contentsMappedAtPath(_options.outputPath, error);
    return former ? helpIndexFileWithLUXIndexData(*former, semanticData, error) : std::nullopt;
  }

  /// The keyword index, empty where none is wanted, and the semantic data.
  std::pair<platform::Data, platform::Data> _finishShards() {
    const WorkLimits limits{_workerCount, UINT64_MAX};
    const auto free = [](size_t) { return uint64_t{0}; };
    OrderedWork<bool>::run(_shards.size(), limits,
                           {free,
                            [this](size_t piece, size_t) {
                              _shards[piece]->prepareToFinish();
                              return true;
                            },
                            {}});
    IndexShard& whole = *_shards.front();
    for (size_t shard = 1; shard < _shards.size(); ++shard) {
      whole.absorb(*_shards[shard]);
      _shards[shard].reset();
    }
    // Keywords first: one after the other, the semantic data need more memory while they are made.
    std::vector<std::function<void()>> halves;
    platform::Data keywords;
    platform::Data semanticData;
    if (!_options.appendLUXOnly) {
      halves.emplace_back([&] { keywords = whole.finishKeywords(); });
    }
    halves.emplace_back([&] { semanticData = whole.finishSemanticData(_workerCount); });
    OrderedWork<bool>::run(halves.size(), limits,
                           {free,
                            [&](size_t piece, size_t) {
                              halves[piece]();
                              return true;
                            },
                            {}});
    _shards.clear();
    return {keywords, semanticData};
  }

  const CreateOptions& _options;
  Report& _report;
  std::shared_ptr<platform::FileManager> _files;
  Outcome _outcome;
  const size_t _workerCount;
  std::vector<FoundPage> _pages;
  /// The first files, read ahead to find out the language.
  std::vector<PreparedFile> _prepared;
  std::shared_ptr<const HelpTokenizer> _tokenizer;
  /// One of each a worker.
  std::vector<std::unique_ptr<FilePreparer>> _preparers;
  std::vector<std::unique_ptr<IndexShard>> _shards;
  AnchorTable _anchors;
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

#include "bvmake/PreparedFile.h"

#include <fmt/format.h>

#include <exception>
#include <utility>

#include "bvmake/IncludedFiles.h"
#include "bvmake/PageReader.h"
#include "bvmake/Summary.h"
#include "platform/Files.h"

namespace bvmake {

namespace {

/// "page" for "/a/page.html": how a page is called that has no other name.
std::string nameFromPath(const std::string& path) {
  const std::string name = platform::lastPathComponent(path);
  return name.substr(0, name.rfind('.'));
}

}  // namespace

FilePreparer::FilePreparer(const PreparationOptions& options, const std::string& folder,
                           std::shared_ptr<platform::FileManager> files)
    : _options(options),
      _files(std::move(files)),
      _includedFiles(std::make_unique<IncludedFiles>(folder, _files)),
      _summarizer(std::make_unique<Summarizer>()) {}

FilePreparer::~FilePreparer() = default;

PreparedFile FilePreparer::prepare(const FoundPage& found) {
  PreparedFile file;
  std::string why;
  try {
    platform::Error error;
    if (_read(found, file, &error)) {
      return file;
    }
    why = error.description;
  } catch (const std::exception& exception) {
    why = exception.what();
  }
  file.pages.clear();
  file.messages = {
      {Message::Kind::warning, 0, fmt::format("{}: {}; the page is left out", found.file, why)}};
  file.skippedCount = 1;
  file.emptyCount = 0;
  return file;
}

bool FilePreparer::_read(const FoundPage& found, PreparedFile& file, platform::Error* error) {
  if (found.size > maximumPageSize) {
    *error = tooLargeError();
    return false;
  }
  const auto bytes = _files->contentsAtPath(found.file, error);
  if (!bytes) {
    return false;
  }
  file.inputBytes = bytes->length();
  if (found.kind == PageKind::docBook) {
    return _readDocBook(found, bytes->view(), file, error);
  }
  std::optional<Page> page = readPage(found.kind, bytes->view(), error);
  if (!page) {
    return false;
  }
  _addPage(found, std::move(*page), file);
  return true;
}

bool FilePreparer::_readDocBook(const FoundPage& found, std::string_view bytes, PreparedFile& file,
                                platform::Error* error) {
  const DocBookLoader load = [&](const std::string& from, std::string_view reference,
                                 std::string& why) {
    std::optional<DocBookFile> included = _includedFiles->load(from, reference, why);
    file.inputBytes += included ? included->text.size() : 0;
    return included;
  };
  std::optional<DocBookPages> document =
      readDocBookPages(IncludedFiles::nameOfFile(found.file), bytes, load, error);
  if (!document) {
    return false;
  }
  for (const std::string& note : document->notes) {
    file.messages.push_back({Message::Kind::warning, 0, fmt::format("{}: {}", found.file, note)});
  }
  for (Page& page : document->pages) {
    _addPage(found, std::move(page), file);
  }
  return true;
}

void FilePreparer::_addPage(const FoundPage& found, Page page, PreparedFile& file) {
  std::string path = page.fragment.empty() ? found.path : found.path + "#" + page.fragment;
  if (!page.hasText() && page.anchors.empty()) {
    _tell(2, fmt::format("{}: nothing in it", path), file);
    ++file.emptyCount;
    return;
  }
  PreparedPage prepared;
  prepared.title = !page.title.empty()      ? page.title
                   : !page.fragment.empty() ? page.fragment
                                            : nameFromPath(found.path);
  prepared.abstract = page.description;
  if (prepared.abstract.empty() && _options.generateSummaries && !page.excludedFromSearch) {
    prepared.abstract = _summarizer->summary(page);
  }
  _tell(2, page.excludedFromSearch ? path + ": asks not to be indexed" : path, file);
  prepared.path = std::move(path);
  prepared.page = std::move(page);
  file.pages.push_back(std::move(prepared));
}

void FilePreparer::_tell(int verbosity, std::string text, PreparedFile& file) const {
  if (verbosity <= _options.verbosity) {
    file.messages.push_back({Message::Kind::progress, verbosity, std::move(text)});
  }
}

}  // namespace bvmake

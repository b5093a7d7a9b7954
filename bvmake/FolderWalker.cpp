#include "bvmake/FolderWalker.h"

#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <set>
#include <system_error>
#include <utility>

#include "bvmake/Report.h"
#include "platform/Environment.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

namespace fs = std::filesystem;

/// 0 for a file that has just gone: reading it will tell.
uint64_t sizeOfFile(const std::string& file) {
  std::error_code code;
  const uintmax_t size = fs::file_size(file, code);
  return code ? 0 : size;
}

/// "index.docbook#start.html": the pages of a document have such names.
bool hasNameOfPart(std::string_view name) {
  return name.starts_with(docBookFileName) && name.substr(docBookFileName.size()).starts_with('#');
}

class Walk {
 public:
  Walk(std::string folder, Report& report)
      : _files(platform::Environment::current()->files),
        _folder(std::move(folder)),
        _report(report) {}

  std::optional<std::vector<FoundPage>> run(platform::Error* error) {
    bool isFolder = false;
    if (!_files->fileExistsAtPath(_folder, &isFolder)) {
      return _fail(error, ENOENT);
    }
    if (!isFolder) {
      return _fail(error, ENOTDIR);
    }
    std::error_code code;
    _root = fs::canonical(_folder, code).string();
    if (code) {
      return _fail(error, code.value());
    }
    // Sub-folders still to be listed, as paths within the folder; the folder itself is "".
    std::vector<std::string> waiting{{}};
    while (!waiting.empty()) {
      const std::string path = std::move(waiting.back());
      waiting.pop_back();
      const auto names = _files->namesInDirectory(_folder + path);
      if (!names && path.empty()) {
        return _fail(error, EACCES);
      }
      if (!names) {
        _report.warning(fmt::format("cannot list the folder {}; it is left out", _folder + path));
        continue;
      }
      for (const std::string& name : *names) {
        std::string child = path;
        child.append("/").append(name);
        _visit(std::move(child), name, waiting);
      }
    }
    _followLinks();
    std::sort(_pages.begin(), _pages.end(),
              [](const FoundPage& a, const FoundPage& b) { return a.path < b.path; });
    return std::move(_pages);
  }

 private:
  std::optional<std::vector<FoundPage>> _fail(platform::Error* error, int number) const {
    if (error != nullptr) {
      *error = platform::posixError(number, _folder);
    }
    return std::nullopt;
  }

  void _visit(std::string path, const std::string& name, std::vector<std::string>& waiting) {
    std::error_code code;
    const fs::file_status status = fs::symlink_status(_folder + path, code);
    if (code) {
      _report.warning(fmt::format("cannot look at {}: {}", _folder + path, code.message()));
      return;
    }
    if (status.type() == fs::file_type::directory) {
      waiting.push_back(std::move(path));
      return;
    }
    const std::optional<PageKind> kind = pageKindOfFileName(name);
    if (!kind || hasNameOfPart(name)) {
      return;
    }
    if (!platform::isValidUTF8(path)) {
      _report.warning(fmt::format("the name of {} is not UTF-8; the page is left out", path));
      return;
    }
    if (status.type() == fs::file_type::symlink) {
      _links.push_back({path, _folder + path, *kind, 0});
    } else if (status.type() == fs::file_type::regular) {
      std::string file = _folder + path;
      const uint64_t size = sizeOfFile(file);
      _pages.push_back({std::move(path), std::move(file), *kind, size});
    }
  }

  void _followLinks() {
    std::sort(_links.begin(), _links.end(),
              [](const FoundPage& a, const FoundPage& b) { return a.path < b.path; });
    std::set<std::string> targets;
    const std::string inside = _root == "/" ? _root : _root + "/";
    for (FoundPage& link : _links) {
      std::error_code code;
      const std::string target = fs::canonical(link.file, code).string();
      if (code) {
        _report.progress(3, fmt::format("{}: a link that leads nowhere", link.path));
      } else if (target.compare(0, inside.size(), inside) != 0) {
        _report.progress(1, fmt::format("{}: a link out of the folder, left out", link.path));
      } else if (!fs::is_regular_file(target, code) || pageKindOfFileName(target) ||
                 !targets.insert(target).second) {
        _report.progress(3, fmt::format("{}: a link to what is found anyway", link.path));
      } else {
        link.size = sizeOfFile(target);
        _pages.push_back(std::move(link));
      }
    }
  }

  std::shared_ptr<platform::FileManager> _files;
  std::string _folder;
  /// The folder's own path, free of links.
  std::string _root;
  Report& _report;
  std::vector<FoundPage> _pages;
  std::vector<FoundPage> _links;
};

}  // namespace

std::optional<std::vector<FoundPage>> findPages(const std::string& folder, Report& report,
                                                platform::Error* error) {
  std::string name = folder;
  while (name.size() > 1 && name.back() == '/') {
    name.pop_back();
  }
  return Walk(name, report).run(error);
}

}  // namespace bvmake

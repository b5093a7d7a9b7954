#include "bvmake/Check.h"

#include <fmt/format.h>

#include <optional>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "SearchKit/IndexCheck.h"
#include "SearchKit/IndexReader.h"
#include "bvmake/HelpIndexFile.h"
#include "bvmake/Printable.h"
#include "bvmake/Report.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/LUXIndexCheck.h"
#include "platform/ClassicArchive.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

using platform::Value;

class Checker {
 public:
  explicit Checker(const Value& root) : _root(root) {}

  std::vector<std::string> run() {
    _expect(helpindexkeys::indexData, Value::Kind::data, "data");
    _expect(helpindexkeys::luxIndexData, Value::Kind::data, "data");
    _expect(helpindexkeys::anchorData, Value::Kind::dictionary, "a dictionary");
    _expect(helpindexkeys::useRemoteRoot, Value::Kind::boolean, "a boolean");
    _expect(helpindexkeys::preferNetworkFiles, Value::Kind::boolean, "a boolean");
    _expect(helpindexkeys::remoteRoot, Value::Kind::string, "a string");
    if (const platform::Data* bytes = _root[helpindexkeys::indexData].dataIf()) {
      _checkKeywords(*bytes);
    }
    if (const platform::Data* bytes = _root[helpindexkeys::luxIndexData].dataIf()) {
      _take("semantic data", LUXIndexProblems(*bytes, maximumProblemCount));
      _checkSemanticPages(*bytes);
    }
    if (const Value::Dictionary* anchors = _root[helpindexkeys::anchorData].dictionaryIf()) {
      _checkAnchors(*anchors);
    }
    return std::move(_problems);
  }

 private:
  void _expect(const char* key, Value::Kind kind, std::string_view name) {
    const Value& value = _root[key];
    if (!value.isAbsent() && value.kind() != kind) {
      _problems.push_back(fmt::format("the value of {} is not {}", key, name));
    }
  }

  void _take(std::string_view part, const std::vector<std::string>& problems) {
    for (const std::string& problem : problems) {
      _problems.push_back(fmt::format("{}: {}", part, problem));
    }
    if (problems.size() == maximumProblemCount) {
      _problems.push_back(fmt::format("{}: there may be more", part));
    }
  }

  void _checkKeywords(const platform::Data& bytes) {
    _index = SKIndexOpenWithData(bytes);
    if (_index == nullptr) {
      _problems.emplace_back("keyword index: it cannot be opened");
      return;
    }
    _take("keyword index", searchkit::indexProblems(*_index, maximumProblemCount));
  }

  bool _isIndexed(std::string_view path) const {
    return searchkit::indexDocumentIDForPath(*_index, path).has_value();
  }

  // The semantic data have all pages of the keyword index, and those that ask not to be found.
  void _checkSemanticPages(const platform::Data& bytes) {
    const auto data = HelpLUXIndex::initWithVersionedData(bytes);
    if (data == nullptr || _index == nullptr) {
      return;
    }
    std::vector<std::string> problems;
    for (const std::string& key : data->documentKeys()) {
      if (problems.size() < maximumProblemCount && !_isIndexed("/" + key) &&
          !data->fileProperitesForKey(key)[HelpDocPropertyExcludeFromSearch].boolValue()) {
        problems.push_back(fmt::format("the page {} is not in the keyword index", key));
      }
    }
    _take("semantic data", problems);
  }

  void _checkAnchors(const Value::Dictionary& anchors) {
    std::vector<std::string> problems;
    for (const auto& entry : anchors) {
      if (problems.size() >= maximumProblemCount) {
        break;
      }
      const std::string problem = _problemOfAnchor(entry.second);
      if (!problem.empty()) {
        problems.push_back(fmt::format("{}: {}", entry.first, problem));
      }
    }
    _take("anchors", problems);
  }

  std::string _problemOfAnchor(const Value& value) const {
    const Value::Array* paths = value.arrayIf();
    if (paths == nullptr || paths->empty()) {
      return "no list of pages";
    }
    const std::string* before = nullptr;
    for (const Value& element : *paths) {
      const std::string* path = element.stringIf();
      if (path == nullptr || !path->starts_with('/')) {
        return "no path of a page";
      }
      if (before != nullptr && *before >= *path) {
        return "pages out of order";
      }
      if (_index != nullptr && !_isIndexed(*path)) {
        return fmt::format("the page {} is not in the keyword index", *path);
      }
      before = path;
    }
    return {};
  }

  const Value& _root;
  SKIndexRef _index;
  std::vector<std::string> _problems;
};

std::vector<std::string> problemsOfBytes(const platform::Data& bytes) {
  try {
    const Value root = platform::ClassicUnarchiver(bytes).decodeRootObject();
    if (root.dictionaryIf() == nullptr) {
      return {"no help index: an archive, but not of a dictionary"};
    }
    return helpIndexProblems(root);
  } catch (const platform::Exception& exception) {
    return {"no help index: " + exception.reason()};
  }
}

}  // namespace

std::vector<std::string> helpIndexProblems(const Value& root) { return Checker(root).run(); }

ExitCode check(const std::string& path, std::string& output, Report& report) {
  platform::Error error;
  const auto bytes = platform::Environment::current()->files->contentsMappedAtPath(path, &error);
  if (!bytes) {
    report.error(fmt::format("cannot read {}", error.description));
    return ExitCode::failure;
  }
  const std::vector<std::string> problems = problemsOfBytes(*bytes);
  for (const std::string& problem : problems) {
    output += printable(fmt::format("{}: {}", path, problem)) + "\n";
  }
  output += printable(path);
  output +=
      problems.empty() ? ": sound\n" : fmt::format(": damaged, {} problems\n", problems.size());
  return problems.empty() ? ExitCode::success : ExitCode::damaged;
}

}  // namespace bvmake

#include "bvmake/Inspect.h"

#include <fmt/format.h>

#include <string_view>
#include <vector>

#include "SearchKit/IndexReader.h"
#include "bvmake/HelpIndexFile.h"
#include "bvmake/Printable.h"
#include "bvmake/Report.h"
#include "host/Luxwell/HelpLUXIndex.h"

namespace bvmake {

namespace {

std::string describe(const platform::Value& value) {
  using Kind = platform::Value::Kind;
  switch (value.kind()) {
    case Kind::boolean:
      return value.boolValue() ? "true" : "false";
    case Kind::integer:
      return fmt::format("number {}", value.integerValue());
    case Kind::real:
      return fmt::format("number {}", value.doubleValue());
    case Kind::string:
      return fmt::format("string \"{}\"", printable(*value.stringIf()));
    case Kind::data:
      return fmt::format("data, {} bytes", value.dataIf()->length());
    case Kind::array:
      return fmt::format("array, {} elements", value.arrayIf()->size());
    case Kind::dictionary:
      return fmt::format("dictionary, {} entries", value.dictionaryIf()->size());
    default:
      return "something else";
  }
}

class Inspection {
 public:
  Inspection(const InspectOptions& options, std::string& output, Report& report)
      : _options(options), _output(output), _report(report) {}

  ExitCode run() {
    platform::Error error;
    std::optional<platform::Value> root = readHelpIndexFile(_options.path, &error);
    if (!root) {
      _report.error(fmt::format("{} is no help index that can be read: {}", _options.path,
                                error.description));
      return ExitCode::failure;
    }
    _root = std::move(*root);
    _showKeys();
    if (const platform::Data* bytes = _root[helpindexkeys::indexData].dataIf()) {
      _index = SKIndexOpenWithData(*bytes);
      if (_index == nullptr) {
        _report.error(fmt::format("{}: the keyword index cannot be opened", _options.path));
        return ExitCode::failure;
      }
    }
    _showIndex();
    _showSemanticData();
    _showAnchors();
    if (_options.term) {
      _showTerm(*_options.term);
    }
    if (_options.anchor) {
      _showAnchor(*_options.anchor);
    }
    if (_options.pages) {
      _showPages();
    }
    return ExitCode::success;
  }

 private:
  template <typename... Arguments>
  void _line(fmt::format_string<Arguments...> format, Arguments&&... arguments) {
    fmt::format_to(std::back_inserter(_output), format, std::forward<Arguments>(arguments)...);
    _output += '\n';
  }

  void _showKeys() {
    _line("{}", printable(_options.path));
    _line("keys:");
    for (const auto& entry : *_root.dictionaryIf()) {
      _line("  {}: {}", printable(entry.first), describe(entry.second));
    }
  }

  void _showIndex() {
    if (_index == nullptr) {
      _line("keyword index: none");
      return;
    }
    const searchkit::IndexSummary summary = searchkit::indexSummary(*_index);
    _line("keyword index: {} pages, {} terms, {} words, {} bytes", summary.documentCount,
          summary.termCount, summary.wordCount, summary.byteLength);
    _line("  format {}.{}, tokenizer {} with ICU {}.{}, shortest term {}", summary.formatVersion,
          summary.formatRevision, summary.tokenizerRules, summary.icuMajor, summary.icuMinor,
          summary.minimumTermLength);
    for (const searchkit::SectionInfo& section : summary.sections) {
      _line("  section {}: {} bytes{}", section.name, section.length,
            section.isIntact ? "" : ", DAMAGED");
    }
  }

  void _showSemanticData() {
    const platform::Data* bytes = _root[helpindexkeys::luxIndexData].dataIf();
    if (bytes == nullptr) {
      _line("semantic data: none");
      return;
    }
    const auto index = HelpLUXIndex::initWithVersionedData(*bytes);
    const auto sections = LUXSectionedData::read(*bytes);
    if (index == nullptr || !sections) {
      _line("semantic data: {} bytes that cannot be read", bytes->length());
      return;
    }
    const platform::Value& attributes = index->attributes();
    const std::vector<std::string> keys = index->documentKeys();
    const LUXTokenCounts first =
        keys.empty() ? LUXTokenCounts() : index->tokenCountsForKey(keys[0]);
    _line("semantic data: {} pages, {} tokens, {} bytes", keys.size(), first.table()->size(),
          bytes->length());
    _line("  language {}, thresholds {:.3f} and {:.3f}{}",
          printable(attributes[HelpLUXIndexAttributeLanguageKey].stringValue().value_or("none")),
          attributes[HelpLUXIndexAttributeBigramThresholdKey].doubleValue(),
          attributes[HelpLUXIndexAttributeTrigramThresholdKey].doubleValue(),
          attributes[HelpLUXIndexAttributeIgnoreLUXKey].boolValue() ? ", not to be used" : "");
    for (const LUXSection& section : sections->sections()) {
      _line("  section {}: {} bytes{}", section.type, section.bytes.length(),
            section.checksumMatches() ? "" : ", DAMAGED");
    }
  }

  void _showAnchors() {
    const platform::Value::Dictionary* anchors = _root[helpindexkeys::anchorData].dictionaryIf();
    if (anchors == nullptr) {
      _line("anchors: none");
      return;
    }
    size_t places = 0;
    for (const auto& entry : *anchors) {
      const platform::Value::Array* paths = entry.second.arrayIf();
      places += paths == nullptr ? 0 : paths->size();
    }
    _line("anchors: {} names, {} places", anchors->size(), places);
  }

  /// "  /path: Title".
  void _showPage(std::string_view path, const std::optional<std::string_view>& title) {
    if (title) {
      _line("  {}: {}", printable(path), printable(*title));
    } else {
      _line("  {}", printable(path));
    }
  }

  void _showTerm(const std::string& text) {
    const std::vector<std::string> terms =
        _index == nullptr ? std::vector<std::string>() : SKIndexCopyUniqueTerms(_index, text);
    if (terms.empty()) {
      _line("term \"{}\": no word that an index could have", printable(text));
    }
    for (const std::string& term : terms) {
      const std::vector<SKDocumentID> ids = searchkit::indexDocumentsWithTerm(*_index, term);
      _line("term \"{}\": {} pages", printable(term), ids.size());
      for (const SKDocumentID id : ids) {
        if (const auto document = searchkit::indexDocument(*_index, id)) {
          _showPage(document->path, document->title);
        }
      }
    }
  }

  void _showAnchor(const std::string& name) {
    const platform::Value& paths = _root[helpindexkeys::anchorData][name];
    const platform::Value::Array none;
    const platform::Value::Array& list = paths.arrayIf() == nullptr ? none : *paths.arrayIf();
    _line("anchor \"{}\": {} pages", printable(name), list.size());
    for (const platform::Value& path : list) {
      if (path.stringIf() == nullptr) {
        continue;
      }
      std::optional<std::string_view> title;
      if (_index != nullptr) {
        if (const auto id = searchkit::indexDocumentIDForPath(*_index, *path.stringIf())) {
          const auto document = searchkit::indexDocument(*_index, *id);
          title = document ? document->title : std::nullopt;
        }
      }
      _showPage(*path.stringIf(), title);
    }
  }

  void _showPages() {
    const uint32_t count = _index == nullptr ? 0 : searchkit::indexDocumentCount(*_index);
    _line("pages:");
    for (SKDocumentID id = 0; id < count; ++id) {
      const auto document = searchkit::indexDocument(*_index, id);
      if (!document) {
        _line("  page {}: DAMAGED", id);
        continue;
      }
      _showPage(document->path, document->title);
      if (document->abstract) {
        _line("    {}", printable(*document->abstract));
      }
    }
  }

  const InspectOptions& _options;
  std::string& _output;
  Report& _report;
  platform::Value _root;
  SKIndexRef _index;
};

}  // namespace

ExitCode inspect(const InspectOptions& options, std::string& output, Report& report) {
  return Inspection(options, output, report).run();
}

}  // namespace bvmake

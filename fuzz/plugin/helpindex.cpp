// Help-index files, as a record reads them and searches use them.
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/Environment.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "plugin/records/ZEBHelpindexIndex.h"

namespace {

// One file, whatever the path.
class OneFile : public platform::FileManager {
 public:
  explicit OneFile(platform::Data content) : _content(std::move(content)) {}

  std::optional<platform::Data> contentsMappedAtPath(const std::string& /*path*/,
                                                     platform::Error* /*error*/) const override {
    return _content;
  }

 private:
  const platform::Data _content;
};

// Has every message made and keeps none.
class ForgetfulLogSink : public platform::LogSink {
 public:
  void write(int /*level*/, std::string_view /*message*/) override {}
  bool accepts(int /*level*/) const noexcept override { return true; }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const auto content =
      platform::Data::copy(std::string_view(reinterpret_cast<const char*>(data), size));
  platform::Environment environment = *platform::Environment::current();
  environment.files = std::make_shared<OneFile>(content);
  environment.log = std::make_shared<ForgetfulLogSink>();
  const platform::EnvironmentOverride override(std::move(environment));

  const auto index = ZEBHelpindexIndex::initWithPath("/book/a.helpindex");
  if (!index) {
    return 0;
  }
  index->setBookID("book");
  const auto controller = ZEBHelpindexSearchController::init();
  controller->doSearchForString("a b", {index}, {"file:///book/a.html"});
  const platform::Value anchors = index->anchorDictionary();
  if (const auto* names = anchors.dictionaryIf()) {
    size_t count = 0;
    for (const auto& [name, paths] : *names) {
      controller->doLookupOfAnchor(name, {index});
      if (++count == 10) {
        break;
      }
    }
  }
  index->shouldUseLUXIndex();
  index->luxIndex();
  index->luxIndexData();
  index->remoteURL();
  index->description();
  index->reinitializeWithData(content.slice(0, size / 2));
  controller->doSearchForString("\"a b\" | c*", {index}, {});
  return 0;
}

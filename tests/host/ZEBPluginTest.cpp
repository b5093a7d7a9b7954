#include "host/Zebrine/ZEBPlugin.h"

#include <gtest/gtest.h>

#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"

namespace {

/// A plug-in that has only what every plug-in must have.
class MinimalPlugin : public ZEBPlugin {
 public:
  void startSearchForQuery(const std::shared_ptr<ZEBQuery>& /*query*/) override {}
  void completeSearchForQuery(const std::shared_ptr<ZEBQuery>& /*query*/) override {}
  std::shared_ptr<ZEBPluginOwner> owner() const override { return nullptr; }
  std::string pluginID() const override { return "org.example.plugin"; }
  std::vector<std::string> resultTypes() const override { return {}; }
};

TEST(ZEBPlugin, optionalMembersMayBeLeftOut) {
  MinimalPlugin plugin;
  plugin.buildCache();
  plugin.finishPopulatingBookWithID("org.example.book");
  plugin.finishPopulatingKnownBooks();
  plugin.removeIndexForBookWithID("org.example.book");
  plugin.notifyEvent(-1, {});
  EXPECT_EQ(plugin.pluginID(), "org.example.plugin");
}

TEST(ZEBPlugin, anchorLookUpIsTakenForGranted) {
  EXPECT_TRUE(MinimalPlugin().supportsAnchorLookup());
}

TEST(ZEBPluginOwner, aBatchIsRecordsOrPlainTexts) {
  const ZEBResultBatch records = std::vector<std::shared_ptr<ZEBResult>>{};
  const ZEBResultBatch texts = std::vector<std::string>{"print"};
  EXPECT_TRUE(std::holds_alternative<std::vector<std::shared_ptr<ZEBResult>>>(records));
  EXPECT_EQ(std::get<std::vector<std::string>>(texts).front(), "print");
}

}  // namespace

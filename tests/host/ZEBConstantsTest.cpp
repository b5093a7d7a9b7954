#include "host/Zebrine/ZEBConstants.h"

#include <gtest/gtest.h>

#include <set>
#include <vector>

namespace {

TEST(ZEBConstants, allStringsDifferAndNoneIsEmpty) {
  const std::vector<std::string> all = {
      ZEBHelpArticleResult,
      ZEBHelpSuggestionResult,
      ZEBHelpSimilarSuggestionResult,
      ZEBHelpActionResult,
      ZEBResultURLKey,
      ZEBResultBookIDKey,
      ZEBResultAbstractKey,
      ZEBResultIndexIDKey,
      ZEBResultIsExactMatchKey,
      ZEBResultUsesExternalViewerKey,
      ZEBResultAppVersionKey,
      ZEBResultIsDuplicateAppKey,
      ZEBQueryAnchorSearchOptionKey,
      ZEBQuerySearchAllBooksOptionKey,
      ZEBQuerySkipShutdownDelayOptionKey,
      ZEBBookIndexRemoteURLKey,
      ZEBBookEMRemoteURLKey,
      ZEBBookLocalizationKey,
      ZEBCFBundleHelpBookID,
      ZEBCFBundleHelpBookFolder,
      KROrvHelpbookID,
      KROfflineHelpbookID,
      KROfflineHelpTopicNotConnected,
      ZEBDaemonBundleID,
      ZEBKestrelBundleID,
      ZEBHelpindexExtension,
      ZEBGeneratedIndexDirectory,
      QWBookRegistrationNotification,
  };
  const std::set<std::string> distinct(all.begin(), all.end());
  EXPECT_EQ(distinct.size(), all.size());
  EXPECT_EQ(distinct.count(""), 0U);
}

TEST(ZEBConstants, remoteBooksAreOfTypeFour) {
  EXPECT_EQ(ZEBHelpBookType4, 4);
  EXPECT_EQ(
      (std::set<int32_t>{ZEBHelpBookType1, ZEBHelpBookType2, ZEBHelpBookType3, ZEBHelpBookType4}),
      (std::set<int32_t>{1, 2, 3, 4}));
}

TEST(ZEBConstants, theOptionThatSkipsTheDelayIsNamedByItsLiteral) {
  EXPECT_EQ(ZEBQuerySkipShutdownDelayOptionKey, "ZEBSkipShutdownDelay");
}

TEST(ZEBConstants, theLanguageChangeIsEventOne) { EXPECT_EQ(ZEBPluginEventLanguageChanged, 1); }

}  // namespace

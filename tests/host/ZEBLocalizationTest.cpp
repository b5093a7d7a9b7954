#include "host/Zebrine/ZEBLocalization.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using Tags = std::vector<std::string>;

std::optional<std::string> best(const Tags& available, const Tags& preferred,
                                std::string_view development = {}) {
  return ZEBBestLocalization(available, preferred, development);
}

TEST(ZEBLocalization, theWholeTagWinsOverTheLanguageAlone) {
  EXPECT_EQ(best({"en", "pt", "pt_BR"}, {"pt-BR"}), "pt_BR");
}

TEST(ZEBLocalization, aMissingRegionFallsBackToTheLanguage) {
  EXPECT_EQ(best({"en", "pt"}, {"pt-BR"}), "pt");
  EXPECT_EQ(best({"en", "zh", "zh_Hant"}, {"zh-Hant-TW"}), "zh_Hant");
}

TEST(ZEBLocalization, aMissingLanguageFallsBackToTheNextPreferredOne) {
  EXPECT_EQ(best({"de", "en", "fr"}, {"pt-BR", "fr", "de"}), "fr");
}

TEST(ZEBLocalization, withoutAPreferredLanguageTheDevelopmentLanguageIsNext) {
  EXPECT_EQ(best({"de", "en", "fr"}, {"pt-BR"}, "fr-CA"), "fr");
}

TEST(ZEBLocalization, thenEnglishThenTheFirst) {
  EXPECT_EQ(best({"de", "en", "fr"}, {"pt-BR"}), "en");
  EXPECT_EQ(best({"de", "en_GB"}, {"pt-BR"}, "it"), "en_GB");
  EXPECT_EQ(best({"fr", "de"}, {"pt-BR"}), "de");
}

TEST(ZEBLocalization, anotherRegionServesALanguageAloneButNotARegion) {
  EXPECT_EQ(best({"en", "pt_BR", "pt_PT"}, {"pt"}), "pt_BR");
  EXPECT_EQ(best({"en", "pt_PT"}, {"pt-BR"}), "en");
  EXPECT_EQ(best({"en", "ptx"}, {"pt"}), "en");
}

TEST(ZEBLocalization, spellingOfTagsMakesNoDifference) {
  EXPECT_EQ(best({"en", "PT-br"}, {"pt_BR"}), "PT-br");
  EXPECT_EQ(best({"ca", "en"}, {"ca_ES.UTF-8@valencia"}), "ca");
}

TEST(ZEBLocalization, emptyAndOddTagsMatchNothing) {
  EXPECT_EQ(best({"de", "en"}, {"", "C", "_", ".UTF-8"}), "en");
}

TEST(ZEBLocalization, nothingAvailableGivesNothing) {
  EXPECT_EQ(best({}, {"en"}, "en"), std::nullopt);
}

}  // namespace

#include "zebd/Languages.h"

#include <gmock/gmock.h>

namespace {

using testing::ElementsAre;
using zebd::bestLanguage;
using zebd::languageFallbacks;

TEST(Languages, CountryFallsBackToLanguageThenEnglishThenOriginal) {
  EXPECT_THAT(languageFallbacks({"pt-BR"}), ElementsAre("pt_BR", "pt", "en", "C"));
}

TEST(Languages, ScriptAndCountryFallBackOneByOne) {
  EXPECT_THAT(languageFallbacks({"zh-Hant-TW"}),
              ElementsAre("zh_Hant_TW", "zh_Hant", "zh", "en", "C"));
}

TEST(Languages, AllPreferredLanguagesComeBeforeEnglish) {
  EXPECT_THAT(languageFallbacks({"de", "fr"}), ElementsAre("de", "fr", "en", "C"));
}

TEST(Languages, OriginalCountsAsEnglish) {
  EXPECT_THAT(languageFallbacks({"en-GB", "de"}), ElementsAre("en_GB", "en", "C", "de"));
}

TEST(Languages, NoPreferenceMeansEnglish) {
  EXPECT_THAT(languageFallbacks({}), ElementsAre("en", "C"));
}

TEST(Languages, FirstFallbackThatIsThereIsBest) {
  const auto fallbacks = languageFallbacks({"pt-BR"});
  EXPECT_EQ(bestLanguage({"C", "de", "pt", "pt_BR"}, fallbacks), "pt_BR");
  EXPECT_EQ(bestLanguage({"C", "de", "pt"}, fallbacks), "pt");
  EXPECT_EQ(bestLanguage({"C", "de"}, fallbacks), "C");
}

TEST(Languages, FoldersMayBeSpelledWithHyphensAndInAnyCase) {
  EXPECT_EQ(bestLanguage({"PT-br"}, languageFallbacks({"pt-BR"})), "PT-br");
}

TEST(Languages, RegionalFormServesWhereNothingElseDoes) {
  EXPECT_EQ(bestLanguage({"de-DE", "en-US"}, languageFallbacks({"en"})), "en-US");
  EXPECT_EQ(bestLanguage({"C", "en-US"}, languageFallbacks({"en"})), "C");
}

TEST(Languages, OtherLanguagesAreNotBetterThanNone) {
  EXPECT_EQ(bestLanguage({"de", "fr"}, languageFallbacks({"pt-BR"})), std::nullopt);
  EXPECT_EQ(bestLanguage({}, languageFallbacks({"pt-BR"})), std::nullopt);
}

}  // namespace

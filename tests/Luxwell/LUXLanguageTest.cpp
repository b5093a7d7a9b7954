#include "host/Luxwell/LUXLanguage.h"

#include <gtest/gtest.h>
#include <libstemmer.h>

#include <set>
#include <string>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXLanguageGuess.h"

namespace {

std::string localization(std::string_view tag) {
  return HelpTokenizer::luxLocalizationForLanguage(tag).value_or("nothing");
}

std::string guessed(std::initializer_list<std::string_view> texts) {
  LUXLanguageGuess guess;
  for (const std::string_view text : texts) {
    guess.addText(text);
  }
  return guess.language().tag;
}

}  // namespace

TEST(LUXLanguage, TagsWithRegionOrScriptAreTheirLanguage) {
  EXPECT_EQ(localization("en"), "English");
  EXPECT_EQ(localization("en-GB"), "English");
  EXPECT_EQ(localization("pt_BR"), "Portuguese");
  EXPECT_EQ(localization("zh-Hant-TW"), "Chinese");
  EXPECT_EQ(localization("zh_Hans"), "Chinese");
  EXPECT_EQ(localization("sr-Latn-RS"), "Serbian");
  EXPECT_EQ(localization("de-CH-1996"), "German");
  EXPECT_EQ(localization("DE-at"), "German");
}

TEST(LUXLanguage, LocaleNamesOfTheSystemAreTaken) {
  EXPECT_EQ(localization("en_US.UTF-8"), "English");
  EXPECT_EQ(localization("de_DE@euro"), "German");
  EXPECT_EQ(localization("ca_ES.UTF-8@valencia"), "Catalan");
}

TEST(LUXLanguage, OtherCodesOfALanguageAreTaken) {
  EXPECT_EQ(localization("deu"), "German");
  EXPECT_EQ(localization("ger"), "German");
  EXPECT_EQ(localization("iw"), "Hebrew");
  EXPECT_EQ(localization("nb-NO"), "Norwegian");
  EXPECT_EQ(localization("nn"), "Norwegian");
  EXPECT_EQ(localization("cmn-Hans-CN"), "Chinese");
  EXPECT_EQ(localization("fil"), "Tagalog");
}

TEST(LUXLanguage, FolderNamesAreTakenInAnyCase) {
  EXPECT_EQ(localization("English"), "English");
  EXPECT_EQ(localization("japanese"), "Japanese");
}

TEST(LUXLanguage, WhatIsNoTagOrNotSupportedGivesNothing) {
  for (const char* tag :
       {"", "e", "-en", "en-", "en--US", "en-toolongsubtag", "x-private", "C", "POSIX", "tlh", "xx",
        "english-GB", "en US", "i-klingon", "en-\xFF", "日本語"}) {
    EXPECT_EQ(localization(tag), "nothing") << tag;
  }
}

TEST(LUXLanguage, NamesAndTagsAreEachThereOnce) {
  std::set<std::string> names;
  std::set<std::string> tags;
  std::string before;
  for (const LUXLanguage& language : LUXLanguage::all()) {
    EXPECT_TRUE(names.insert(language.localization).second) << language.localization;
    EXPECT_TRUE(tags.insert(language.tag).second) << language.tag;
    EXPECT_LT(before, language.localization);
    before = language.localization;
  }
}

TEST(LUXLanguage, EveryStemmerIsThere) {
  size_t count = 0;
  for (const LUXLanguage& language : LUXLanguage::all()) {
    if (language.stemmer != nullptr) {
      sb_stemmer* stemmer = sb_stemmer_new(language.stemmer, nullptr);
      EXPECT_NE(stemmer, nullptr) << language.stemmer;
      sb_stemmer_delete(stemmer);
      ++count;
    }
  }
  EXPECT_GE(count, 25U);
}

TEST(LUXLanguageGuess, StopWordsTellLanguagesOfOneScript) {
  EXPECT_EQ(guessed({"Choose the file that you want to print and click on the button"}), "en");
  EXPECT_EQ(guessed({"Wählen Sie die Datei, die Sie mit dem Programm drucken"}), "de");
  EXPECT_EQ(guessed({"Sélectionnez le fichier que vous voulez imprimer dans la liste"}), "fr");
  EXPECT_EQ(guessed({"Выберите файл, который вы хотите напечатать, и что в нём есть для вас"}),
            "ru");
  EXPECT_EQ(guessed({"Виберіть файл, який ви хочете надрукувати, і що в ньому є для вас"}), "uk");
}

TEST(LUXLanguageGuess, ScriptsTellTheirLanguage) {
  EXPECT_EQ(guessed({"文字列の検索と設定"}), "ja");
  EXPECT_EQ(guessed({"打印机设置"}), "zh");
  EXPECT_EQ(guessed({"파일 인쇄"}), "ko");
  EXPECT_EQ(guessed({"Εκτύπωση αρχείων"}), "el");
  EXPECT_EQ(guessed({"เครื่องพิมพ์"}), "th");
  EXPECT_EQ(guessed({"הדפסת קבצים"}), "he");
  EXPECT_EQ(guessed({"طباعة الملفات"}), "ar");
}

TEST(LUXLanguageGuess, EnglishNamesInAnotherScriptDoNotCount) {
  EXPECT_EQ(guessed({"LibreOffice の設定を変更すると、次のとおり表示されます", "Writer"}), "ja");
}

TEST(LUXLanguageGuess, TooLittleTextIsTheForemostOfItsScript) {
  EXPECT_EQ(guessed({"le la"}), "en");
  EXPECT_EQ(guessed({"файл"}), "ru");
  EXPECT_EQ(guessed({}), "en");
  EXPECT_EQ(guessed({"123 ..."}), "en");
  EXPECT_EQ(guessed({"\xFF\xFE"}), "en");
}

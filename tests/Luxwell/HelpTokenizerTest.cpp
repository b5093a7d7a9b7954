#include "host/Luxwell/HelpTokenizer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unicode/ubrk.h>
#include <unicode/uchar.h>
#include <unicode/utext.h>
#include <unicode/utf8.h>

#include <random>
#include <string>
#include <thread>

#include "platform/Strings.h"

using testing::ElementsAre;
using testing::IsEmpty;

namespace {

std::vector<HelpTokenizer::Word> words(std::string_view language, std::string_view text) {
  std::vector<HelpTokenizer::Word> result;
  HelpTokenizer::tokenizerForLanguage(language)->wordsOfText(text, result);
  return result;
}

std::vector<std::string> forms(std::string_view text, std::string_view language = "English") {
  std::vector<std::string> result;
  for (const HelpTokenizer::Word& word : words(language, text)) {
    result.push_back(word.form);
  }
  return result;
}

std::vector<std::string> stems(std::string_view text, std::string_view language = "English") {
  std::vector<std::string> result;
  for (const HelpTokenizer::Word& word : words(language, text)) {
    result.push_back(word.stem);
  }
  return result;
}

std::vector<std::string> surfaces(std::string_view text, std::string_view language = "English") {
  std::vector<std::string> result;
  for (const HelpTokenizer::Word& word : words(language, text)) {
    result.push_back(word.surface);
  }
  return result;
}

// The words with "|" before those that break the chain.
std::string chain(std::string_view text, std::string_view language = "English") {
  std::string result;
  for (const HelpTokenizer::Word& word : words(language, text)) {
    result += word.breaksChain ? "|" : " ";
    result += word.form;
  }
  return result;
}

std::vector<std::string> stopWords(std::string_view text, std::string_view language = "English") {
  std::vector<std::string> result;
  for (const HelpTokenizer::Word& word : words(language, text)) {
    if (word.isStopWord) {
      result.push_back(word.form);
    }
  }
  return result;
}

std::string tokenized(std::string_view text, std::string_view language = "English") {
  return HelpTokenizer::tokenizerForLanguage(language)->tokenizedStringFromString(text);
}

// ---- The slow way: ICU's words, divided further.

void appendParts(std::string_view word, std::vector<std::string>& parts) {
  const std::u16string none;
  std::string part;
  std::vector<std::pair<UChar32, std::string>> characters;
  for (int64_t at = 0; at < static_cast<int64_t>(word.size());) {
    const auto begin = static_cast<size_t>(at);
    UChar32 character = 0;
    U8_NEXT(reinterpret_cast<const uint8_t*>(word.data()), at, static_cast<int64_t>(word.size()),
            character);
    characters.emplace_back(character, word.substr(begin, static_cast<size_t>(at) - begin));
  }
  const auto isLetter = [&](size_t i) {
    return i < characters.size() && u_isalpha(characters[i].first) != 0;
  };
  const auto isDigit = [&](size_t i) {
    return i < characters.size() && u_isdigit(characters[i].first) != 0;
  };
  for (size_t i = 0; i < characters.size(); ++i) {
    const UChar32 character = characters[i].first;
    const bool joinsLetters = (character == '\'' || character == 0x2019 || character == 0xB7) &&
                              i > 0 && isLetter(i - 1) && isLetter(i + 1);
    const bool joinsDigits =
        (character == '.' || character == ',') && i > 0 && isDigit(i - 1) && isDigit(i + 1);
    if (isLetter(i) || isDigit(i) || joinsLetters || joinsDigits) {
      part += characters[i].second;
    } else if (!part.empty()) {
      parts.push_back(std::exchange(part, {}));
    }
  }
  if (!part.empty()) {
    parts.push_back(part);
  }
}

std::vector<std::string> slowSurfaces(const std::string& text) {
  UErrorCode status = U_ZERO_ERROR;
  UBreakIterator* iterator = ubrk_open(UBRK_WORD, "", nullptr, 0, &status);
  UText* utext = utext_openUTF8(nullptr, text.data(), static_cast<int64_t>(text.size()), &status);
  ubrk_setUText(iterator, utext, &status);
  EXPECT_TRUE(U_SUCCESS(status));
  std::vector<std::string> parts;
  int32_t begin = ubrk_first(iterator);
  for (int32_t end = ubrk_next(iterator); end != UBRK_DONE; end = ubrk_next(iterator)) {
    if (ubrk_getRuleStatus(iterator) >= UBRK_WORD_NONE_LIMIT) {
      appendParts(std::string_view(text).substr(static_cast<size_t>(begin),
                                                static_cast<size_t>(end - begin)),
                  parts);
    }
    begin = end;
  }
  utext_close(utext);
  ubrk_close(iterator);
  for (std::string& part : parts) {
    for (const std::string_view ending : {"'s", "'S", "\u2019s", "\u2019S"}) {
      if (part.size() > ending.size() && part.ends_with(ending)) {
        part.resize(part.size() - ending.size());
        break;
      }
    }
  }
  return parts;
}

}  // namespace

TEST(HelpTokenizer, GivesFormsStemsAndSurfaces) {
  const auto result = words("English", "Printing Pages");
  ASSERT_EQ(result.size(), 2U);
  EXPECT_EQ(result[0].surface, "Printing");
  EXPECT_EQ(result[0].form, "printing");
  EXPECT_EQ(result[0].stem, "print");
  EXPECT_EQ(result[1].stem, "page");
}

TEST(HelpTokenizer, DropsPossessives) {
  EXPECT_THAT(forms("The user's printer, JAMES'S and the bus’s"),
              ElementsAre("the", "user", "printer", "james", "and", "the", "bus"));
  EXPECT_THAT(surfaces("user’s"), ElementsAre("user"));
}

TEST(HelpTokenizer, KeepsContractionsWholeAsStopWords) {
  EXPECT_THAT(forms("can't won’t"), ElementsAre("can't", "won't"));
  EXPECT_THAT(stopWords("I can't print; it won’t"), ElementsAre("i", "can't", "it", "won't"));
}

TEST(HelpTokenizer, DividesNamesButNotNumbers) {
  EXPECT_THAT(forms("os.path file_name wi-fi std::string user@host a/b"),
              ElementsAre("os", "path", "file", "name", "wi", "fi", "std", "string", "user", "host",
                          "a", "b"));
  EXPECT_THAT(forms("version 3.14, 10,000 pages 1.2.3."),
              ElementsAre("version", "3.14", "10,000", "pages", "1.2.3"));
}

TEST(HelpTokenizer, GivesWholeNamesWithTheirLastWord) {
  std::vector<std::string> wholes;
  for (const auto& word : words("English", "See os.path.join, Foo_Bar and std::string, wi-fi.")) {
    wholes.push_back(word.wholeForm);
  }
  EXPECT_THAT(wholes, ElementsAre("", "", "", "os.path.join", "", "foo_bar", "", "", "std::string",
                                  "", ""));
}

TEST(HelpTokenizer, PunctuationBreaksTheChainAndConnectorsDoNot) {
  EXPECT_EQ(chain("one two, three (four) five. six"), "|one two|three|four|five|six");
  EXPECT_EQ(chain("wi-fi os.path a -b --c d... e"), "|wi fi os path a|b|c d|e");
  EXPECT_EQ(chain("a\nb\tc\u00A0d"), "|a b c d");
}

TEST(HelpTokenizer, EachTextBeginsAChain) {
  std::vector<HelpTokenizer::Word> result;
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage("English");
  tokenizer->wordsOfText("one", result);
  tokenizer->wordsOfText("two", result);
  ASSERT_EQ(result.size(), 2U);
  EXPECT_TRUE(result[1].breaksChain);
}

TEST(HelpTokenizer, FoldsCaseWidthAndDiacritics) {
  EXPECT_THAT(forms("ÉTÉ été e\u0301te\u0301"), ElementsAre("ete", "ete", "ete"));
  EXPECT_THAT(forms("ＡＢＣ ﬁle Straße"), ElementsAre("abc", "file", "strasse"));
  EXPECT_THAT(forms("ø ł æ"), ElementsAre("o", "l", "ae"));
}

TEST(HelpTokenizer, StemsBeforeDiacriticsGo) {
  EXPECT_THAT(stems("Häuser", "German"), ElementsAre("haus"));
  EXPECT_THAT(stems("paramètres", "French"), ElementsAre("parametr"));
  EXPECT_THAT(stems("параметрами", "Russian"), ElementsAre("параметр"));
}

TEST(HelpTokenizer, ElidedArticlesAreStopWordsOfTheirOwn) {
  EXPECT_THAT(forms("l'image d’été qu'on", "French"),
              ElementsAre("l", "image", "d", "ete", "qu", "on"));
  EXPECT_THAT(stopWords("l'image dell'opera", "Italian"), ElementsAre("l", "dell"));
}

TEST(HelpTokenizer, TurkishEndingsAfterApostrophesAreDroppedAndIHasNoDot) {
  EXPECT_THAT(surfaces("Türkiye'nin İstanbul’da", "Turkish"), ElementsAre("Türkiye", "İstanbul"));
  EXPECT_THAT(forms("IŞIK ışık", "Turkish"), ElementsAre("isik", "isik"));
}

TEST(HelpTokenizer, ChineseJapaneseAndThaiAreDividedByDictionary) {
  EXPECT_THAT(forms("文字列の検索とWriterの設定", "Japanese"),
              ElementsAre("文字", "列", "の", "検索", "と", "writer", "の", "設定"));
  EXPECT_THAT(forms("打印机设置", "Chinese"), ElementsAre("打印", "机", "设置"));
  EXPECT_THAT(forms("เครื่องพิมพ์และกระดาษ", "Thai"), ElementsAre("เครื่องพิมพ์", "และ", "กระดาษ"));
  EXPECT_THAT(stopWords("文字列の検索", "Japanese"), ElementsAre("の"));
  EXPECT_EQ(chain("検索と設定。保存", "Japanese"), "|検索 と 設定|保存");
}

TEST(HelpTokenizer, HalfWidthKanaAreTheFullOnes) {
  EXPECT_EQ(forms("ﾌﾟﾘﾝﾀ", "Japanese"), forms("プリンタ", "Japanese"));
}

TEST(HelpTokenizer, KoreanParticlesAndVerbEndingsGo) {
  EXPECT_THAT(stems("파일을 프린터에서 인쇄하려면 LibreOffice의", "Korean"),
              ElementsAre("파일", "프린터", "인쇄", "libreoffice"));
  EXPECT_THAT(stems("나이 표", "Korean"), ElementsAre("나이", "표"));
  EXPECT_THAT(forms("파일을", "Korean"), ElementsAre("파일을"));
}

TEST(HelpTokenizer, RightToLeftTextLosesItsPoints) {
  EXPECT_THAT(forms("الكِتاب كتـــاب", "Arabic"), ElementsAre("الكتاب", "كتاب"));
  EXPECT_THAT(forms("שָׁלוֹם צה״ל", "Hebrew"), ElementsAre("שלום", "צהל"));
  EXPECT_THAT(forms("\u200Fשלום\u200E עולם", "Hebrew"), ElementsAre("שלום", "עולם"));
  EXPECT_THAT(stopWords("الملف في المجلد", "Arabic"), ElementsAre("في"));
}

TEST(HelpTokenizer, LigaturesOfWholePhrasesAreOneWord) {
  const auto result = forms("\uFDFA", "Arabic");
  ASSERT_EQ(result.size(), 1U);
  EXPECT_EQ(result[0].find(' '), std::string::npos);
}

TEST(HelpTokenizer, VowelSignsOfIndicScriptsStay) {
  EXPECT_THAT(forms("हिन्दी में", "Hindi"), ElementsAre("हिन्दी", "में"));
}

TEST(HelpTokenizer, IllFormedTextSeparates) {
  EXPECT_THAT(forms("one\xFFtwo \xC3 three\xE3\x81"), ElementsAre("one", "two", "three"));
  EXPECT_EQ(chain("one\xFFtwo"), "|one|two");
  EXPECT_THAT(forms("Ａ\xFFＢ"), ElementsAre("a", "b"));
}

TEST(HelpTokenizer, TextWithoutWordsGivesNone) {
  EXPECT_THAT(forms(""), IsEmpty());
  EXPECT_THAT(forms(" \n.,;!?—…'\"“”()[]{}"), IsEmpty());
  EXPECT_THAT(forms("\u0301\u200D\u00AD"), IsEmpty());
}

TEST(HelpTokenizer, LongWordsAreCutBetweenCharacters) {
  const auto ascii = forms(std::string(100000, 'x'));
  ASSERT_EQ(ascii.size(), 1U);
  EXPECT_EQ(ascii[0].size(), HelpTokenizer::maximumFormLength);
  std::string wide;
  for (int i = 0; i < 1000; ++i) {
    wide += "жй";
  }
  const auto cut = forms(wide);
  ASSERT_EQ(cut.size(), 1U);
  EXPECT_LE(cut[0].size(), HelpTokenizer::maximumFormLength);
  EXPECT_TRUE(platform::isValidUTF8(cut[0]));
}

TEST(HelpTokenizer, LongRunsWithoutBlanksTakeLittleTime) {
  std::string text;
  for (int i = 0; i < 20000; ++i) {
    text += "設定検索";
  }
  EXPECT_GT(forms(text, "Japanese").size(), 20000U);
}

TEST(HelpTokenizer, WordsAreThoseOfICUDividedFurther) {
  // Characters of which any may stand beside any other.
  const std::vector<std::string> alphabet = {
      "a", "b",  "Z",  "é",  "ß", "ж", "λ", "1", "2", "9",      " ",  " ",  " ", ".", ",",
      "'", "’",  "-",  "_",  ":", ";", "/", "(", ")", "\"",     "\n", "s",  "S", "@", "&",
      "…", "\t", "'s", "’s", "·", "§", "€", "!", "?", "\u00A0", "x",  "y2", "+"};
  std::mt19937 random(7);
  for (int round = 0; round < 4000; ++round) {
    std::string text;
    const size_t length = random() % 24;
    for (size_t i = 0; i < length; ++i) {
      text += alphabet[random() % alphabet.size()];
    }
    EXPECT_EQ(surfaces(text), slowSurfaces(text)) << text;
  }
}

TEST(HelpTokenizer, TokenizedStringsAreTheStemsOfTheWordsThatCount) {
  EXPECT_EQ(tokenized("Printing the Pages"), "print page");
  EXPECT_EQ(tokenized("How to print pages?"), tokenized("PRINTING PAGE"));
  EXPECT_EQ(tokenized("  Print:  page "), "print page");
  EXPECT_EQ(tokenized(""), "");
  EXPECT_EQ(tokenized("?!"), "");
}

TEST(HelpTokenizer, TokenizedStringsOfStopWordsAloneAreTheirForms) {
  EXPECT_EQ(tokenized("About"), "about");
  EXPECT_EQ(tokenized("Who are we"), "who are we");
  EXPECT_NE(tokenized("About"), tokenized("Who are we"));
}

TEST(HelpTokenizer, CountsGrams) {
  const auto count = HelpTokenizer::countOfGramsInTokenString;
  EXPECT_EQ(count("", " "), 0U);
  EXPECT_EQ(count("print", " "), 1U);
  EXPECT_EQ(count("print queue status", " "), 3U);
  EXPECT_EQ(count(" print  queue ", " "), 2U);
  EXPECT_EQ(count("a--b", "--"), 2U);
  EXPECT_EQ(count("print queue", ""), 1U);
  EXPECT_EQ(count("", ""), 0U);
}

TEST(HelpTokenizer, OneTokenizerForEachLanguage) {
  const auto english = HelpTokenizer::tokenizerForLanguage("English");
  ASSERT_NE(english, nullptr);
  EXPECT_EQ(english, HelpTokenizer::tokenizerForLanguage("en-GB"));
  EXPECT_NE(english, HelpTokenizer::tokenizerForLanguage("French"));
  EXPECT_EQ(HelpTokenizer::tokenizerForLanguage("Klingon"), nullptr);
  EXPECT_EQ(english->localization(), "English");
  EXPECT_EQ(english->languageTag(), "en");
}

TEST(HelpTokenizer, EverySupportedLanguageDividesText) {
  for (const std::string& name : HelpTokenizer::supportedLocalizations()) {
    EXPECT_EQ(HelpTokenizer::luxLocalizationForLanguage(name), name);
    EXPECT_THAT(forms("alpha 7", name), ElementsAre("alpha", "7")) << name;
  }
}

TEST(HelpTokenizer, StopWordsAreNoWordsThatPagesAreAbout) {
  EXPECT_THAT(stopWords("printer file window page network error user on off up down out open"),
              ElementsAre("on"));
  EXPECT_THAT(stopWords("how what when where which who why can could should would do does did i me "
                        "my you your it its there this that these those"),
              testing::SizeIs(26));
}

TEST(HelpTokenizer, VersionNamesRulesAndICU) {
  EXPECT_GE(HelpTokenizer::version() >> 16U, 1U);
  EXPECT_EQ((HelpTokenizer::version() >> 8U) & 0xFFU,
            static_cast<uint32_t>(U_ICU_VERSION_MAJOR_NUM));
}

TEST(HelpTokenizer, DisplayHasBlanksOnlyWhereScriptsHaveThem) {
  std::string display;
  HelpTokenizer::appendToDisplay(display, "print");
  HelpTokenizer::appendToDisplay(display, "queue");
  EXPECT_EQ(display, "print queue");
  HelpTokenizer::appendToDisplay(display, "の");
  HelpTokenizer::appendToDisplay(display, "設定");
  HelpTokenizer::appendToDisplay(display, "Writer");
  EXPECT_EQ(display, "print queueの設定Writer");
}

TEST(HelpTokenizer, ThreadsDoNotDisturbEachOther) {
  const std::string text = "The printers' queues: 文字列の検索 เครื่องพิมพ์ and Ｗｉｄｅ words";
  const auto expected = stems(text);
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      for (int round = 0; round < 200; ++round) {
        EXPECT_EQ(stems(text), expected);
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

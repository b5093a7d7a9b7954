#include "SearchKit/Tokenizer.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <initializer_list>
#include <random>
#include <string>
#include <string_view>
#include <vector>

#include "SearchKit/IndexFormat.h"

namespace searchkit {
namespace {

using Terms = std::vector<std::string>;

Terms terms(std::string_view text) {
  Terms all;
  Tokenizer().tokenize(text, [&](std::string_view term, bool) { all.emplace_back(term); });
  return all;
}

Terms longTerms(std::string_view text, size_t minimumTermLength) {
  Terms kept;
  Tokenizer(minimumTermLength).tokenize(text, [&](std::string_view term, bool isShort) {
    if (!isShort) {
      kept.emplace_back(term);
    }
  });
  return kept;
}

TEST(Tokenizer, splitsAtBlanksAndPunctuation) {
  EXPECT_EQ(terms("Print the queue, then: (wait)!"),
            (Terms{"print", "the", "queue", "then", "wait"}));
  EXPECT_EQ(terms(""), Terms{});
  EXPECT_EQ(terms(" ?! … — "), Terms{});
}

TEST(Tokenizer, splitsInsideTechnicalWords) {
  EXPECT_EQ(terms("wi-fi"), (Terms{"wi", "fi"}));
  EXPECT_EQ(terms("file_name.txt"), (Terms{"file", "name", "txt"}));
  EXPECT_EQ(terms("C++ C#"), (Terms{"c", "c"}));
  EXPECT_EQ(terms("x86_64 mp3 3.14"), (Terms{"x86", "64", "mp3", "3", "14"}));
  EXPECT_EQ(terms("user@example.org"), (Terms{"user", "example", "org"}));
}

TEST(Tokenizer, splitsAtEveryApostrophe) {
  const Terms expected{"don", "t"};
  EXPECT_EQ(terms("don't"), expected);
  EXPECT_EQ(terms("don’t"), expected);
  EXPECT_EQ(terms("donʼt"), expected);
  EXPECT_EQ(terms("l'imprimante d’été"), (Terms{"l", "imprimante", "d", "ete"}));
}

TEST(Tokenizer, foldsWordsOfManyScripts) {
  EXPECT_EQ(terms("Größe Ñandú Łódź"), (Terms{"grosse", "nandu", "lodz"}));
  EXPECT_EQ(terms("Печать документов"), (Terms{"печать", "документов"}));
  EXPECT_EQ(terms("Εκτύπωση ΣΕΛΊΔΑΣ"), (Terms{"εκτυπωση", "σελιδασ"}));
  EXPECT_EQ(terms("طباعة المستند"), (Terms{"طباعة", "المستند"}));
  EXPECT_EQ(terms("הדפסה של־מסמך"), (Terms{"הדפסה", "של", "מסמך"}));
  EXPECT_EQ(terms("छपाई करें"), (Terms{"छपाई", "करें"}));
  EXPECT_EQ(terms("அச்சிடு"), (Terms{"அச்சிடு"}));
  EXPECT_EQ(terms("ბეჭდვა"), (Terms{"ბეჭდვა"}));
}

TEST(Tokenizer, findsWordsWithoutBlanks) {
  EXPECT_EQ(terms("東京に行く"), (Terms{"東京", "に", "行く"}));
  EXPECT_EQ(terms("打印文件"), (Terms{"打印", "文件"}));
  EXPECT_EQ(terms("ภาษาไทยง่าย"), (Terms{"ภาษา", "ไทย", "ง่าย"}));
  EXPECT_EQ(terms("프린터를 설치"), (Terms{"프린터를", "설치"}));
  EXPECT_GT(terms("ខ្ញុំស្រលាញ់ភាសាខ្មែរ").size(), 1U);
  EXPECT_GT(terms("ພາສາລາວ").size(), 1U);
  EXPECT_GT(terms("မြန်မာဘာသာစကား").size(), 1U);
}

TEST(Tokenizer, splitsWhereScriptsWithAndWithoutBlanksMeet) {
  EXPECT_EQ(terms("2023年PDF印刷"), (Terms{"2023", "年", "pdf", "印刷"}));
  EXPECT_EQ(terms("ｶﾗｰ印刷"), (Terms{"カラー", "印刷"}));
}

TEST(Tokenizer, countsCharactersNotBytesForTheMinimum) {
  EXPECT_EQ(longTerms("a is the word", 3), (Terms{"the", "word"}));
  EXPECT_EQ(longTerms("и на для", 3), (Terms{"для"}));
  EXPECT_EQ(longTerms("été où", 3), (Terms{"ete"}));
}

TEST(Tokenizer, keepsShortTermsOfScriptsWithoutBlanks) {
  EXPECT_EQ(longTerms("東京に行く to 문", 3), (Terms{"東京", "に", "行く", "문"}));
}

TEST(Tokenizer, cutsVeryLongWordsAtACharacter) {
  const Terms ascii = terms(std::string(100000, 'x'));
  ASSERT_EQ(ascii.size(), 1U);
  EXPECT_EQ(ascii[0].size(), format::maximumTermBytes);
  std::string cyrillic;
  for (int i = 0; i < 1000; ++i) {
    cyrillic += "ж";
  }
  ASSERT_EQ(terms(cyrillic).size(), 1U);
  EXPECT_EQ(terms(cyrillic)[0].size(), format::maximumTermBytes - 1);
}

TEST(Tokenizer, treatsIllFormedBytesAsSeparators) {
  EXPECT_EQ(terms("one\xFFtwo \xC3 three\xE2\x80 four\xF0\x9F"),
            (Terms{"one", "two", "three", "four"}));
  EXPECT_EQ(terms(std::string_view("nul\0inside", 10)), (Terms{"nul", "inside"}));
}

TEST(Tokenizer, takesMegabytesWithoutAnyBlank) {
  std::string text;
  for (int i = 0; i < 60000; ++i) {
    text += "東京都";
  }
  EXPECT_GT(terms(text).size(), 60000U);
}

// What the tables give must be what the library gives, whatever stands beside what.
TEST(Tokenizer, tablesAgreeWithTheLibrary) {
  const std::vector<std::string> pieces{
      "a",      "Z",      "7",       " ",      "-",      "'",      "’",        "é",      "ß",
      "\u0301", "\u00AD", "\u200B",  "\u200D", "\u2028", "ﬁ",      "ø",        "İ",      "ı",
      "ж",      "Й",      "Σ",       "ς",      "שׁ",      "ָ",       "أ",        "ِ",       "ـ",
      "½",      "²",      "ª",       "ŉ",      "東",     "カ",     "ﾞ",        "ー",     "ไ",
      "ท",      "ี",       "한",      "😀",      "\xFF",   "\xC3",   "\xE2\x80", "\u00A0", "…",
      "\u0345", "क",      "ि",       "\n",     ".",      "_",      "×",        "\u02BC", "\u205F",
      "\u2060", "\u202A", "𝐀\u0308", "₿",    "ﷺ",      "\u00B4", "¨",        "·",      "€",
      "京都",   "が",     "\u3099",  "、",     "。",     "（",     "Ａ",       "・",     "々",
      "ᄒ",     "ᅡ",     "ᆫ",      "하",     "\u3000", "１",     "ｶ",        "豈",     "𠀀"};
  std::mt19937 random(20240611);
  Tokenizer tokenizer;
  for (int round = 0; round < 60000; ++round) {
    std::string text;
    for (auto count = random() % 9; count > 0; --count) {
      text += pieces[random() % pieces.size()];
    }
    Terms byTables;
    Terms byLibrary;
    tokenizer.tokenize(text, [&](std::string_view term, bool) { byTables.emplace_back(term); });
    tokenizer.tokenizeByLibrary(text,
                                [&](std::string_view term, bool) { byLibrary.emplace_back(term); });
    ASSERT_EQ(byTables, byLibrary) << "round " << round << ": " << text;
  }
}

Terms byLibrary(std::string_view text) {
  Terms all;
  Tokenizer().tokenizeByLibrary(text, [&](std::string_view term, bool) { all.emplace_back(term); });
  return all;
}

std::string joined(std::initializer_list<std::string_view> parts) {
  std::string text;
  for (const std::string_view part : parts) {
    text += part;
  }
  return text;
}

TEST(Tokenizer, characterByCharacterAgreesWithTheLibrary) {
  for (uint32_t character = 0x80; character < 0x10000; ++character) {
    if (character >= 0xD800 && character < 0xE000) {
      continue;
    }
    std::string text = "a";
    if (character < 0x800) {
      text += static_cast<char>(0xC0 | character >> 6);
    } else {
      text += static_cast<char>(0xE0 | character >> 12);
      text += static_cast<char>(0x80 | (character >> 6 & 0x3F));
    }
    text += static_cast<char>(0x80 | (character & 0x3F));
    const std::string alone = text.substr(1);
    text += joined({"b ", alone, " 東", alone, "京 ", alone, alone});
    ASSERT_EQ(terms(text), byLibrary(text)) << std::hex << character;
  }
}

// Words are found in blocks: they may begin and end anywhere in one.
TEST(Tokenizer, takesWordsOfAnyLengthAnywhere) {
  for (size_t before = 0; before < 140; ++before) {
    for (const size_t length : {1U, 2U, 7U, 8U, 9U, 63U, 64U, 65U, 128U, 200U}) {
      const std::string word(length, 'W');
      const std::string lower(length, 'w');
      const std::string gap(before, '.');
      EXPECT_EQ(terms(gap + word), Terms{lower});
      EXPECT_EQ(terms(joined({gap, word, "-", word})), (Terms{lower, lower}));
      EXPECT_EQ(terms(joined({gap, word, "’s"})), (Terms{lower, "s"}));
      EXPECT_EQ(terms(joined({gap, word, "é x"})), (Terms{lower + "e", "x"}));
      EXPECT_EQ(terms(joined({"a ", gap, word, "東"})), (Terms{"a", lower, "東"}));
    }
  }
}

TEST(Tokenizer, findsTheSameWordsInARunThatComesAgain) {
  std::mt19937 random(17);
  const std::vector<std::string> phrases{"印刷の設定", "用紙を選ぶ", "打印文件", "프린터를",
                                         "カラー"};
  Tokenizer tokenizer;
  for (int round = 0; round < 20000; ++round) {
    std::string text;
    for (auto count = 1 + random() % 3; count > 0; --count) {
      text += phrases[random() % phrases.size()];
    }
    text += round % 7 == 0 ? "。" + std::to_string(round) : std::string();
    Terms found;
    tokenizer.tokenize(text, [&](std::string_view term, bool) { found.emplace_back(term); });
    if (round % 50 == 0 || round < 100) {
      ASSERT_EQ(found, byLibrary(text)) << text;
    }
    ASSERT_FALSE(found.empty());
  }
}

TEST(Tokenizer, termsCanBeReadAFewBytesFurther) {
  Tokenizer tokenizer;
  for (const char* text : {"a", "ab é", "東", "x東y", "ไทย", "日本語 z"}) {
    const std::string exact(text);
    tokenizer.tokenize(exact, [&](std::string_view term, bool) {
      char copy[Tokenizer::readableLength];
      std::memcpy(copy, term.data(), sizeof copy);
      EXPECT_EQ(std::string_view(copy, std::min(term.size(), sizeof copy)),
                term.substr(0, sizeof copy));
    });
  }
}

TEST(Tokenizer, ofATermGivesTheTerm) {
  for (const char* text : {"Print the Größe queue", "Печать й", "छपाई करें", "طباعة أحمد",
                           "프린터를 설치", "don’t ﬁle x²"}) {
    for (const std::string& term : terms(text)) {
      EXPECT_EQ(terms(term), Terms{term});
    }
  }
}

}  // namespace
}  // namespace searchkit

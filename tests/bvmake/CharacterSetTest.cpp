#include "bvmake/CharacterSet.h"

#include <gtest/gtest.h>
#include <unicode/ucnv.h>
#include <unicode/unistr.h>

#include <string>

#include "platform/Strings.h"

namespace bvmake {
namespace {

using namespace std::string_literals;

TEST(CharacterSet, utf8IsTakenWithoutDeclaration) {
  EXPECT_EQ(textFromBytes("<p>Gr\xC3\xBC\xC3\x9F"s, Markup::html), "<p>Grüß");
}

TEST(CharacterSet, bytesThatAreNoUTF8AreWindows1252WithoutDeclaration) {
  EXPECT_EQ(textFromBytes("<p>Gr\xFC\xDF \x93quoted\x94"s, Markup::html), "<p>Grüß “quoted”");
}

TEST(CharacterSet, byteOrderMarkOfUTF8IsDropped) {
  EXPECT_EQ(textFromBytes("\xEF\xBB\xBF<p>x"s, Markup::html), "<p>x");
}

TEST(CharacterSet, byteOrderMarkWinsOverMeta) {
  const std::string page = "\xEF\xBB\xBF<meta charset=iso-8859-1><p>\xC3\xA9";
  EXPECT_EQ(textFromBytes(page, Markup::html), "<meta charset=iso-8859-1><p>é");
}

TEST(CharacterSet, utf16OfBothByteOrdersIsTakenByItsMark) {
  EXPECT_EQ(textFromBytes("\xFF\xFE<\0p\0>\0\xE9\0"s, Markup::html), "<p>é");
  EXPECT_EQ(textFromBytes("\xFE\xFF\0<\0p\0>\0\xE9"s, Markup::html), "<p>é");
}

TEST(CharacterSet, utf16WithoutMarkIsKnownByItsFirstCharacter) {
  EXPECT_EQ(textFromBytes("<\0p\0>\0\xE9\0"s, Markup::html), "<p>é");
  EXPECT_EQ(textFromBytes("\0<\0p\0>\0\xE9"s, Markup::html), "<p>é");
}

TEST(CharacterSet, utf16CutInTheMiddleIsTakenAsFarAsItGoes) {
  const auto text = textFromBytes("\xFF\xFE<\0p\0>\0x"s, Markup::html);
  ASSERT_TRUE(text);
  EXPECT_EQ(text->substr(0, 3), "<p>");
  EXPECT_TRUE(platform::isValidUTF8(*text));
}

TEST(CharacterSet, metaCharsetDeclaresInAnySpelling) {
  EXPECT_EQ(declaredCharacterSet("<meta charset=\"KOI8-R\">", Markup::html), "koi8-r");
  EXPECT_EQ(declaredCharacterSet("<META CHARSET = koi8-r />", Markup::html), "koi8-r");
  EXPECT_EQ(declaredCharacterSet("<meta content='text/html; charset=koi8-r' "
                                 "http-equiv='Content-Type'>",
                                 Markup::html),
            "koi8-r");
  EXPECT_EQ(declaredCharacterSet("<meta/charset=koi8-r>", Markup::html), "koi8-r");
}

TEST(CharacterSet, metaThatOnlySpeaksOfCharsetsDeclaresNone) {
  EXPECT_EQ(declaredCharacterSet("<meta name=description content='charset=koi8-r explained'>",
                                 Markup::html),
            "");
  EXPECT_EQ(declaredCharacterSet("<!-- <meta charset=koi8-r> -->", Markup::html), "");
  EXPECT_EQ(declaredCharacterSet("<metadata charset=koi8-r>", Markup::html), "");
}

TEST(CharacterSet, firstDeclaringMetaCounts) {
  EXPECT_EQ(
      declaredCharacterSet("<meta name=a><meta charset=koi8-r><meta charset=utf-8>", Markup::html),
      "koi8-r");
}

TEST(CharacterSet, xmlDeclarationDeclares) {
  EXPECT_EQ(declaredCharacterSet("<?xml version='1.0' encoding='ISO-8859-2'?>", Markup::xml),
            "iso-8859-2");
  EXPECT_EQ(textFromBytes("<?xml version='1.0' encoding='ISO-8859-2'?>\xB1"s, Markup::xml),
            "<?xml version='1.0' encoding='ISO-8859-2'?>ą");
}

TEST(CharacterSet, metaWinsOverXMLDeclarationInHTMLAndMeansNothingInXML) {
  const std::string page = "<?xml version='1.0' encoding='iso-8859-2'?><meta charset='koi8-r'>";
  EXPECT_EQ(declaredCharacterSet(page, Markup::html), "koi8-r");
  EXPECT_EQ(declaredCharacterSet(page, Markup::xml), "iso-8859-2");
}

TEST(CharacterSet, manyByteSetsAreConverted) {
  EXPECT_EQ(textFromBytes("<meta charset=shift_jis>\x93\xFA\x96\x7B"s, Markup::html),
            "<meta charset=shift_jis>日本");
  EXPECT_EQ(textFromBytes("<meta charset=euc-jp>\xC6\xFC\xCB\xDC"s, Markup::html),
            "<meta charset=euc-jp>日本");
  EXPECT_EQ(textFromBytes("<meta charset=gb2312>\xD6\xD0\xB9\xFA"s, Markup::html),
            "<meta charset=gb2312>中国");
  EXPECT_EQ(textFromBytes("<meta charset=big5>\xA4\xA4"s, Markup::html), "<meta charset=big5>中");
  EXPECT_EQ(textFromBytes("<meta charset=euc-kr>\xC7\xD1"s, Markup::html),
            "<meta charset=euc-kr>한");
}

TEST(CharacterSet, latin1MeansWindows1252AsOnTheWeb) {
  EXPECT_EQ(textFromBytes("<meta charset=iso-8859-1>\x80"s, Markup::html),
            "<meta charset=iso-8859-1>€");
  EXPECT_EQ(textFromBytes("<meta charset=us-ascii>\x92"s, Markup::html),
            "<meta charset=us-ascii>’");
}

std::string inSet(const std::string& text, const char* set) {
  UErrorCode status = U_ZERO_ERROR;
  const icu::UnicodeString characters = icu::UnicodeString::fromUTF8(text);
  std::string bytes(text.size() * 4 + 16, '\0');
  UConverter* const converter = ucnv_open(set, &status);
  const int32_t length =
      ucnv_fromUChars(converter, bytes.data(), static_cast<int32_t>(bytes.size()),
                      characters.getBuffer(), characters.length(), &status);
  EXPECT_TRUE(U_SUCCESS(status)) << set;
  ucnv_close(converter);
  bytes.resize(static_cast<size_t>(length));
  return bytes;
}

struct Sample {
  const char* set;
  const char* text;
};

// A few sentences each, as a short page has them.
constexpr Sample samples[] = {
    {"windows-1251",
     "Чтобы напечатать документ, выберите принтер из списка и нажмите кнопку. Если бумага "
     "закончилась, положите новую в лоток и продолжите печать."},
    {"KOI8-R",
     "Чтобы напечатать документ, выберите принтер из списка и нажмите кнопку. Если бумага "
     "закончилась, положите новую в лоток и продолжите печать."},
    {"Shift_JIS",
     "文書を印刷するには、一覧からプリンターを選び、ボタンを押してください。用紙がなくなったら、"
     "トレイに入れて印刷を続けます。"},
    {"EUC-JP",
     "文書を印刷するには、一覧からプリンターを選び、ボタンを押してください。用紙がなくなったら、"
     "トレイに入れて印刷を続けます。"},
    {"GB18030",
     "要打印文档，请从列表中选择打印机，然后按下按钮。如果纸张用完了，请把新的纸放进纸盒，然后"
     "继续打印。这样就可以了。"},
    {"Big5",
     "要列印文件，請從清單中選擇印表機，然後按下按鈕。如果紙張用完了，請把新的紙放進紙匣，然後"
     "繼續列印。這樣就可以了。"},
    {"EUC-KR",
     "문서를 인쇄하려면 목록에서 프린터를 고르고 단추를 누르십시오. 종이가 떨어지면 새 종이를 "
     "넣고 인쇄를 계속하십시오."},
};

TEST(CharacterSet, undeclaredSetsAreGuessedFromTheirText) {
  for (const Sample& sample : samples) {
    const std::string page = "<html><p>" + std::string(sample.text) + "</p></html>";
    EXPECT_EQ(textFromBytes(inSet(page, sample.set), Markup::html), page) << sample.set;
    EXPECT_EQ(textFromBytes(inSet(page, sample.set), Markup::xml), page) << sample.set;
  }
}

TEST(CharacterSet, declaredSetsAreNotGuessed) {
  for (const Sample& sample : samples) {
    const std::string meta = "<meta charset='" + std::string(sample.set) + "'><p>" + sample.text;
    EXPECT_EQ(textFromBytes(inSet(meta, sample.set), Markup::html), meta) << sample.set;
    const std::string xml =
        "<?xml version='1.0' encoding='" + std::string(sample.set) + "'?><p>" + sample.text;
    EXPECT_EQ(textFromBytes(inSet(xml, sample.set), Markup::xml), xml) << sample.set;
  }
  const std::string wrong =
      inSet("<meta charset=windows-1252>" + std::string(samples[0].text), "windows-1251");
  EXPECT_EQ(textFromBytes(wrong, Markup::html)->find(samples[0].text), std::string::npos);
}

TEST(CharacterSet, textOfWesternEuropeIsNotTakenForAnythingElse) {
  const std::string text =
      "<p>Überprüfen Sie, ob der Drucker eingeschaltet ist. Größere Dokumente können länger "
      "brauchen; wählen Sie dafür die Übersicht über die Aufträge. Führen Sie nötigenfalls "
      "zusätzliche Prüfungen für größere Aufträge durch.</p>";
  EXPECT_EQ(textFromBytes(inSet(text, "windows-1252"), Markup::html), text);
}

TEST(CharacterSet, unknownNamesFallBackToWhatTheBytesLookLike) {
  EXPECT_EQ(textFromBytes("<meta charset=no-such-set>\xC3\xA9"s, Markup::html),
            "<meta charset=no-such-set>é");
  EXPECT_EQ(textFromBytes("<meta charset=no-such-set>\xE9"s, Markup::html),
            "<meta charset=no-such-set>é");
}

TEST(CharacterSet, twoByteSetDeclaredInASCIICannotBeTrue) {
  EXPECT_EQ(textFromBytes("<meta charset=utf-16>\xC3\xA9"s, Markup::html),
            "<meta charset=utf-16>é");
}

TEST(CharacterSet, illFormedUTF8IsRepairedWhereUTF8IsDeclared) {
  const auto text = textFromBytes("<meta charset=utf-8>a\xFF\x62"s, Markup::html);
  EXPECT_EQ(text,
            "<meta charset=utf-8>a\xEF\xBF\xBD"
            "b");
}

TEST(CharacterSet, nulCharactersVanish) {
  EXPECT_EQ(textFromBytes("<p>many words to be sure a\0b"s, Markup::html),
            "<p>many words to be sure ab");
}

TEST(CharacterSet, binaryDataIsNoText) {
  std::string bytes =
      "\x7F"
      "ELF";
  for (int i = 0; i < 1000; ++i) {
    bytes += static_cast<char>(i % 31);
  }
  EXPECT_EQ(textFromBytes(bytes, Markup::html), std::nullopt);
}

TEST(CharacterSet, noBytesAreNoCharacters) { EXPECT_EQ(textFromBytes("", Markup::html), ""); }

TEST(CharacterSet, declarationsCutOffAnywhereDoNoHarm) {
  const std::string page =
      "<?xml version='1.0' encoding='koi8-r'?><!-- c --><meta http-equiv=\"Content-Type\" "
      "content=\"text/html; charset=koi8-r\">";
  for (size_t length = 0; length <= page.size(); ++length) {
    const std::string bytes = page.substr(0, length);
    const auto text = textFromBytes(bytes, Markup::html);
    ASSERT_TRUE(text) << length;
    EXPECT_EQ(*text, bytes);
  }
}

}  // namespace
}  // namespace bvmake

#include "host/Luxwell/LUXLanguage.h"

#include <algorithm>
#include <array>
#include <cstddef>

namespace {

constexpr auto divides = LUXLanguage::Apostrophe::divides;
constexpr auto beginsEnding = LUXLanguage::Apostrophe::beginsEnding;

constexpr LUXLanguage languages[] = {
    {"Afrikaans", "af"},
    {"Albanian", "sq"},
    {"Amharic", "am"},
    {"Arabic", "ar", "arabic"},
    {"Armenian", "hy", "armenian"},
    {"Assamese", "as"},
    {"Asturian", "ast", nullptr, divides},
    {"Azerbaijani", "az", nullptr, beginsEnding},
    {"Basque", "eu", "basque"},
    {"Belarusian", "be"},
    {"Bengali", "bn"},
    {"Bosnian", "bs"},
    {"Breton", "br"},
    {"Bulgarian", "bg"},
    {"Burmese", "my"},
    {"Catalan", "ca", "catalan", divides},
    {"Chinese", "zh"},
    {"Croatian", "hr"},
    {"Czech", "cs"},
    {"Danish", "da", "danish"},
    {"Dutch", "nl", "dutch"},
    {"English", "en", "english"},
    {"Esperanto", "eo"},
    {"Estonian", "et"},
    {"Faroese", "fo"},
    {"Finnish", "fi", "finnish"},
    {"French", "fr", "french", divides},
    {"Galician", "gl"},
    {"Georgian", "ka"},
    {"German", "de", "german"},
    {"Greek", "el", "greek"},
    {"Gujarati", "gu"},
    {"Hebrew", "he"},
    {"Hindi", "hi", "hindi"},
    {"Hungarian", "hu", "hungarian"},
    {"Icelandic", "is"},
    {"Indonesian", "id", "indonesian"},
    {"Irish", "ga", "irish"},
    {"Italian", "it", "italian", divides},
    {"Japanese", "ja"},
    {"Kannada", "kn"},
    {"Kazakh", "kk"},
    {"Khmer", "km"},
    {"Korean", "ko"},
    {"Kurdish", "ku"},
    {"Kyrgyz", "ky"},
    {"Lao", "lo"},
    {"Latin", "la"},
    {"Latvian", "lv"},
    {"Lithuanian", "lt", "lithuanian"},
    {"Luxembourgish", "lb"},
    {"Macedonian", "mk"},
    {"Malay", "ms"},
    {"Malayalam", "ml"},
    {"Maltese", "mt"},
    {"Marathi", "mr"},
    {"Mongolian", "mn"},
    {"Nepali", "ne", "nepali"},
    {"Norwegian", "no", "norwegian"},
    {"Occitan", "oc", nullptr, divides},
    {"Odia", "or"},
    {"Persian", "fa"},
    {"Polish", "pl"},
    {"Portuguese", "pt", "portuguese", divides},
    {"Punjabi", "pa"},
    {"Romanian", "ro", "romanian"},
    {"Russian", "ru", "russian"},
    {"Serbian", "sr", "serbian"},
    {"Sinhala", "si"},
    {"Slovak", "sk"},
    {"Slovenian", "sl"},
    {"Spanish", "es", "spanish"},
    {"Swahili", "sw"},
    {"Swedish", "sv", "swedish"},
    {"Tagalog", "tl"},
    {"Tajik", "tg"},
    {"Tamil", "ta", "tamil"},
    {"Tatar", "tt"},
    {"Telugu", "te"},
    {"Thai", "th"},
    {"Tibetan", "bo"},
    {"Turkish", "tr", "turkish", beginsEnding},
    {"Ukrainian", "uk"},
    {"Urdu", "ur"},
    {"Uyghur", "ug"},
    {"Uzbek", "uz"},
    {"Vietnamese", "vi"},
    {"Welsh", "cy"},
    {"Yiddish", "yi", "yiddish"},
};

struct OtherCode {
  std::string_view code;
  std::string_view tag;
};

// Codes of three letters (ISO 639-2, both of its lists where they differ, and 639-3), codes that
// were replaced, and codes of what is close enough to share a model.
constexpr OtherCode otherCodes[] = {
    {"afr", "af"}, {"alb", "sq"}, {"amh", "am"}, {"ara", "ar"}, {"arb", "ar"}, {"arm", "hy"},
    {"asm", "as"}, {"aze", "az"}, {"baq", "eu"}, {"bel", "be"}, {"ben", "bn"}, {"bod", "bo"},
    {"bos", "bs"}, {"bre", "br"}, {"bul", "bg"}, {"bur", "my"}, {"cat", "ca"}, {"ces", "cs"},
    {"chi", "zh"}, {"ckb", "ku"}, {"cmn", "zh"}, {"cym", "cy"}, {"cze", "cs"}, {"dan", "da"},
    {"deu", "de"}, {"dut", "nl"}, {"ekk", "et"}, {"ell", "el"}, {"eng", "en"}, {"epo", "eo"},
    {"est", "et"}, {"eus", "eu"}, {"fao", "fo"}, {"fas", "fa"}, {"fil", "tl"}, {"fin", "fi"},
    {"fra", "fr"}, {"fre", "fr"}, {"geo", "ka"}, {"ger", "de"}, {"gle", "ga"}, {"glg", "gl"},
    {"gre", "el"}, {"gsw", "de"}, {"guj", "gu"}, {"hbs", "sr"}, {"heb", "he"}, {"hin", "hi"},
    {"hrv", "hr"}, {"hun", "hu"}, {"hye", "hy"}, {"ice", "is"}, {"in", "id"},  {"ind", "id"},
    {"isl", "is"}, {"ita", "it"}, {"iw", "he"},  {"ji", "yi"},  {"jpn", "ja"}, {"kan", "kn"},
    {"kat", "ka"}, {"kaz", "kk"}, {"khm", "km"}, {"kir", "ky"}, {"kor", "ko"}, {"kur", "ku"},
    {"lao", "lo"}, {"lat", "la"}, {"lav", "lv"}, {"lit", "lt"}, {"ltz", "lb"}, {"lvs", "lv"},
    {"mac", "mk"}, {"mal", "ml"}, {"mar", "mr"}, {"may", "ms"}, {"mkd", "mk"}, {"mlt", "mt"},
    {"mo", "ro"},  {"mon", "mn"}, {"msa", "ms"}, {"mya", "my"}, {"nb", "no"},  {"nep", "ne"},
    {"nld", "nl"}, {"nn", "no"},  {"nno", "no"}, {"nob", "no"}, {"nor", "no"}, {"oci", "oc"},
    {"ori", "or"}, {"ory", "or"}, {"pan", "pa"}, {"per", "fa"}, {"pes", "fa"}, {"pol", "pl"},
    {"por", "pt"}, {"prs", "fa"}, {"ron", "ro"}, {"rum", "ro"}, {"rus", "ru"}, {"scc", "sr"},
    {"scr", "hr"}, {"sh", "sr"},  {"sin", "si"}, {"slk", "sk"}, {"slo", "sk"}, {"slv", "sl"},
    {"spa", "es"}, {"sqi", "sq"}, {"srp", "sr"}, {"swa", "sw"}, {"swe", "sv"}, {"swh", "sw"},
    {"tam", "ta"}, {"tat", "tt"}, {"tel", "te"}, {"tgk", "tg"}, {"tgl", "tl"}, {"tha", "th"},
    {"tib", "bo"}, {"tur", "tr"}, {"uig", "ug"}, {"ukr", "uk"}, {"urd", "ur"}, {"uzb", "uz"},
    {"vie", "vi"}, {"wel", "cy"}, {"yid", "yi"}, {"yue", "zh"}, {"zho", "zh"}, {"zsm", "ms"},
};

constexpr char lowered(char byte) noexcept {
  return byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte - 'A' + 'a') : byte;
}

bool equalIgnoringCase(std::string_view a, std::string_view b) noexcept {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return lowered(x) == lowered(y); });
}

const LUXLanguage* withShortTag(std::string_view tag) noexcept {
  for (const LUXLanguage& language : languages) {
    if (tag == language.tag) {
      return &language;
    }
  }
  return nullptr;
}

constexpr size_t longestSubtag = 8;

bool isAlphanumeric(char byte) noexcept {
  const char letter = lowered(byte);
  return (letter >= 'a' && letter <= 'z') || (letter >= '0' && letter <= '9');
}

// Whether what follows the language is made of subtags as tags have them. A character set or
// keywords, from "." or "@" on, may look as they like.
bool areSubtags(std::string_view rest) noexcept {
  while (!rest.empty() && rest.front() != '.' && rest.front() != '@') {
    rest.remove_prefix(1);
    const size_t end = std::min(rest.find_first_of("-_.@"), rest.size());
    const std::string_view subtag = rest.substr(0, end);
    if (subtag.empty() || subtag.size() > longestSubtag ||
        !std::all_of(subtag.begin(), subtag.end(), isAlphanumeric)) {
      return false;
    }
    rest.remove_prefix(end);
  }
  return true;
}

}  // namespace

std::span<const LUXLanguage> LUXLanguage::all() { return languages; }

const LUXLanguage* LUXLanguage::withLocalization(std::string_view localization) {
  for (const LUXLanguage& language : languages) {
    if (equalIgnoringCase(localization, language.localization)) {
      return &language;
    }
  }
  return nullptr;
}

const LUXLanguage* LUXLanguage::withTag(std::string_view languageTag) {
  if (const LUXLanguage* language = withLocalization(languageTag)) {
    return language;
  }
  const size_t end = std::min(languageTag.find_first_of("-_.@"), languageTag.size());
  if (end < 2 || end > 3 || !areSubtags(languageTag.substr(end))) {
    return nullptr;
  }
  std::string code(languageTag.substr(0, end));
  std::transform(code.begin(), code.end(), code.begin(), lowered);
  if (const LUXLanguage* language = withShortTag(code)) {
    return language;
  }
  const auto* const other =
      std::find_if(std::begin(otherCodes), std::end(otherCodes),
                   [&](const OtherCode& entry) { return entry.code == code; });
  return other == std::end(otherCodes) ? nullptr : withShortTag(other->tag);
}

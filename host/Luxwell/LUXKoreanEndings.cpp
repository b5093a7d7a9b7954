#include "host/Luxwell/LUXKoreanEndings.h"

#include <cstddef>

namespace {

// A syllable is three bytes.
constexpr size_t syllable = 3;

// Longer ones first, as they may end in a shorter one. Particles, and forms of the verbs that make
// verbs of nouns.
constexpr std::string_view endings[] = {
    "하였습니다", "되었습니다", "하십시오", "하려는데", "에서부터", "으로부터", "합니다만",
    "했습니다",   "됩니다만",   "됐습니다", "시킵니다", "하려면",   "하거나",   "하도록",
    "하지만",     "하므로",     "되도록",   "되거나",   "되므로",   "에게서",   "이라고",
    "이라는",     "이나마",     "으로써",   "으로서",   "에서는",   "에서의",   "에서도",
    "으로의",     "으로는",     "까지의",   "까지는",   "로부터",   "입니다",   "합니다",
    "됩니다",     "하세요",     "되어야",   "하여야",   "해야만",   "시키는",   "에서",
    "에게",       "으로",       "까지",     "부터",     "처럼",     "만큼",     "보다",
    "마다",       "조차",       "이나",     "이며",     "이고",     "이란",     "이라",
    "로서",       "로써",       "에는",     "에도",     "와의",     "과의",     "와는",
    "과는",       "들을",       "들이",     "들은",     "들의",     "들에",     "하는",
    "하여",       "하기",       "하면",     "하고",     "하지",     "해야",     "한다",
    "했다",       "하게",       "하며",     "되는",     "되어",     "되면",     "되고",
    "되지",       "된다",       "됐다",     "되며",     "시켜",     "을",       "를",
    "이",         "가",         "은",       "는",       "에",       "의",       "로",
    "와",         "과",         "도",       "만",       "나",       "들",       "할",
    "한",         "함",         "해",       "된",       "될",       "됨",       "돼",
};

}  // namespace

std::string_view LUXWithoutKoreanEnding(std::string_view word) noexcept {
  for (const std::string_view ending : endings) {
    // Of one syllable an ending may as well be the end of the noun.
    const size_t least = ending.size() == syllable ? 2 * syllable : syllable;
    if (word.size() >= ending.size() + least && word.ends_with(ending)) {
      return word.substr(0, word.size() - ending.size());
    }
  }
  return word;
}

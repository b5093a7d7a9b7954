#include "host/Luxwell/LUXStopWords.h"

namespace {

struct List {
  std::string_view tag;
  std::string_view words;
};

constexpr List lists[] = {
    {"en",
     "a an the this that these those "
     "i me my mine myself we us our ours ourselves you your yours yourself yourselves he him his "
     "himself she her hers herself it its itself they them their theirs themselves one "
     "who whom whose which what when where why how "
     "am is are was were be been being do does did doing done have has had having "
     "will would shall should can could may might must ought cannot "
     "and or but nor if then else than because as until while so though although whether unless "
     "since of at by for with about against between into through during before after to from "
     "in on onto upon within without toward towards via per among "
     "not no there here again further once also just only very too such same own other another "
     "any some each every both either neither few more most many much all "
     "get got let however therefore thus hence etc ie eg "
     "i'm i've i'd i'll you're you've you'd you'll he'd he'll she'd she'll it'll it'd we're we've "
     "we'd we'll they're they've they'd they'll that'll there'll who'll what'll "
     "isn't aren't wasn't weren't don't doesn't didn't haven't hasn't hadn't won't wouldn't can't "
     "couldn't shan't shouldn't mustn't mightn't needn't"},
};

}  // namespace

std::string_view LUXStopWordsForLanguage(std::string_view tag) noexcept {
  for (const List& list : lists) {
    if (list.tag == tag) {
      return list.words;
    }
  }
  return {};
}

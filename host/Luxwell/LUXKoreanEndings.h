// Korean words without what is written onto them.
#pragma once

#include <string_view>

/// The word without the particle ("프린터에서": 프린터) or the ending of a verb that is made of a
/// noun ("인쇄하려면": 인쇄) that it ends in; the word itself where that would leave too little to
/// be sure. `word` is composed (NFC). Snowball has no algorithm for Korean, and without this hardly
/// any noun of a query would be that of a page. Thread-safety: any thread.
std::string_view LUXWithoutKoreanEnding(std::string_view word) noexcept;

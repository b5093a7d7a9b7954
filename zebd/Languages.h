// Which translation of a help book the user would rather read.
#pragma once

#include <optional>
#include <string>
#include <vector>

namespace zebd {

/// The languages to look for, best first, in the spelling of folder names ("pt_BR"): each preferred
/// one followed by itself without its country or script, and after all of them English and then
/// "C", the untranslated original. Since originals are in English as a rule, "C" directly follows
/// English wherever that stands in the list. For "pt-BR": pt_BR, pt, en, C.
std::vector<std::string> languageFallbacks(const std::vector<std::string>& preferredLanguages);

/// The first of `fallbacks` among the names of folders, hyphens and underscores and letters of
/// either case taken as the same; the folder's own spelling. Where none is there, a regional form
/// of one of them ("en-US" for "en"). Absent when even that is missing.
std::optional<std::string> bestLanguage(const std::vector<std::string>& folders,
                                        const std::vector<std::string>& fallbacks);

}  // namespace zebd

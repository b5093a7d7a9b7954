// Which of several languages suits a user best.
#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

/// The entry of `available` (language tags such as "pt_BR" or "pt-BR", as folders are named) for a
/// user who prefers `preferredLanguages`, the favourite first. For each preferred tag in turn:
/// the tag itself, then the tag without its last part, and so on ("zh_Hant_TW", "zh_Hant", "zh");
/// for a tag of one part, last, the first available one of that language in the order of their
/// bytes. Then `developmentLanguage` (may be empty) in the same way, then "en", then the first
/// available one. Case, '-' or '_', and what follows a '.' or '@' make no difference. Absent only
/// when nothing is available.
std::optional<std::string> ZEBBestLocalization(std::span<const std::string> available,
                                               std::span<const std::string> preferredLanguages,
                                               std::string_view developmentLanguage = {});

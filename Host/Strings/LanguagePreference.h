#pragma once

/// Which languages the user wants, as names of catalogue folders.
///
/// Threads: safe from every thread, as long as nobody changes the environment at that moment. Ownership: results are values.
/// Errors: none. What is no language name is passed over.

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace palisade {

/// The catalogues for one locale name or language tag, best first: "de_DE.UTF-8@euro" gives de_DE and de, "zh-Hant" gives zh_TW
/// and zh, "C" gives en. Empty for anything else that is no such name, so a result never leads out of the folder.
std::vector<std::string> cataloguesForLanguage(std::string_view name);

/// The catalogues to look into, best first, each once, English last: those of `fixedLanguage`, otherwise those that the
/// environment names at this moment.
std::vector<std::string> preferredCatalogues(const std::optional<std::string>& fixedLanguage);

}  // namespace palisade

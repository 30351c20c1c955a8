#pragma once

/// Which languages the user wants, as names of catalogue folders.
///
/// Threads: safe from every thread, as long as nobody changes the environment at that moment. Ownership: results are values.
/// Errors: none. What is no language name is passed over.

#include <string>
#include <string_view>
#include <vector>

namespace palisade {

/// The catalogues for one locale name or language tag, best first: "de_DE.UTF-8@euro" gives de_DE and de, "zh-Hant" gives zh_TW
/// and zh, "C" gives en. Empty for anything else that is no such name, so a result never leads out of the folder.
std::vector<std::string> cataloguesForLanguage(std::string_view name);

/// The languages that the environment names at this moment, divided by colons.
std::string environmentLanguages();

/// The catalogues to look into for a list of languages, best first, each once, English last.
std::vector<std::string> preferredCatalogues(std::string_view languages);

}  // namespace palisade

#pragma once

/// The texts of one compiled catalogue (GNU gettext's .mo format: "The Format of GNU MO Files" in gettext's manual).
///
/// Threads: safe from every thread. Ownership: results are values. Errors: a file that is missing, unreadable, damaged, or in
/// another encoding than UTF-8 holds no texts.

#include <filesystem>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace palisade {

/// Texts by their keys. The empty key's is the catalogue's header; of a text in several numbers it is the first.
using CatalogueTexts = std::map<std::string, std::string, std::less<>>;

/// None when a table or a text that the bytes name does not lie within them, or when they are not in UTF-8.
std::optional<CatalogueTexts> catalogueTexts(std::string_view bytes);

CatalogueTexts readCatalogue(const std::filesystem::path& path);

}  // namespace palisade

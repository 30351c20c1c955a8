#pragma once

/// The file of one compiled catalogue (GNU gettext's .mo format).
///
/// Threads: safe from every thread. Ownership: results are values. Errors: a file that is missing, unreadable or damaged is
/// empty.

#include <filesystem>
#include <string_view>
#include <vector>

namespace palisade {

/// Whether every table and every text that the file's headers name lies within it, so that a reader which trusts them is safe.
bool isWellFormedCatalogue(std::string_view file);

/// The file's bytes, or none at all unless it is well-formed.
std::vector<char> readCatalogue(const std::filesystem::path& path);

}  // namespace palisade

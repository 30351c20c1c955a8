#pragma once

/// TOML files as values: configuration, client records, preferences.
///
/// Threads: pure functions. Errors: `TomlError` says which file, which line and what is wrong. A file that is not there is
/// none.

#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>

#include "Platform/Value.h"

namespace palisade {

class TomlError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

/// The file's table. Dates and times are kept as their text.
std::optional<Dictionary> readTomlFile(const std::filesystem::path& path);

/// Replaces the file: a reader sees the old content or the new one, also after a power cut. Null values are left out.
void writeTomlFile(const std::filesystem::path& path, const Dictionary& table);

}  // namespace palisade

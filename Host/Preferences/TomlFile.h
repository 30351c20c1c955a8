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

/// A file that others could have written. The message says how to mend that.
class ExposedFile : public TomlError {
 public:
  using TomlError::TomlError;
};

/// Throws `ExposedFile` when others than root and this process's user can write the file or its folder. No file is in order.
void requireUnexposed(const std::filesystem::path& path);

/// As `readTomlFile`, of a file that decides for the user: what others could have written is not read.
std::optional<Dictionary> readConfiguration(const std::filesystem::path& path);

/// Sets one value of the file's table, or removes it when there is none. Whatever else stands in the file stays as it is
/// written, comments too, as far as that can be done: the value of a table with lines of its own takes the file's comments with
/// it.
void setInTomlFile(const std::filesystem::path& path, const std::string& key, const std::optional<Value>& value);

/// Replaces the file: a reader sees the old content or the new one, also after a power cut. Null values are left out.
void writeTomlFile(const std::filesystem::path& path, const Dictionary& table);

}  // namespace palisade

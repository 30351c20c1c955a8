#pragma once

/// The files of a store, as a test reads and damages them.

#include <cstddef>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace palisade {

std::string contentOf(const std::filesystem::path& file);
void overwrite(const std::filesystem::path& file, std::size_t offset, std::string_view bytes);

/// In alphabetical order.
std::vector<std::string> namesIn(const std::filesystem::path& folder);

/// The files below the folder that hold the text anywhere.
std::vector<std::string> filesHolding(std::string_view text, const std::filesystem::path& folder);

}  // namespace palisade

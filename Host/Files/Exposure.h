#pragma once

/// Who besides root and this process's user can change a file or put another one in its place.
///
/// In a user namespace root's files have the owner that stands for everybody who is not in it; there they pass for root's.
/// Threads: plain functions. Errors: what cannot be examined is exposed.

#include <sys/stat.h>

#include <filesystem>
#include <optional>
#include <string>

namespace palisade {

struct Exposure {
  std::filesystem::path path;
  /// The end of a sentence that begins with the path.
  std::string problem;
  /// A command that takes the others' rights away.
  std::string remedy;
};

/// Of what stands at `path` and has this status; none when nobody else can write it.
std::optional<Exposure> exposureOf(const std::filesystem::path& path, const struct stat& status);

/// Of a file and the folder it lies in; of a link both here and where it leads. None also when there is no such file.
std::optional<Exposure> exposureOfFile(const std::filesystem::path& file);

/// Of every folder above `path`, which is absolute and without links. In a sticky one others cannot take the place of what is
/// not theirs, and a group that is this user's alone has nobody else in it.
std::optional<Exposure> exposureAbove(const std::filesystem::path& path);

}  // namespace palisade

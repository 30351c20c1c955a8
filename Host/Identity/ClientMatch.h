#pragma once

/// How an application is recognised: the `[match]` table of its record.
///
/// Each of `flatpak`, `snap`, `unit` and `executable` is a way in of its own, with one exception: beside `unit`, the executable
/// is a further condition. A unit is inherited by whatever is started in it, and one interpreter runs many applications, so
/// only both together say something there. Threads: plain values. Errors: none.

#include <filesystem>
#include <optional>
#include <string>

#include "Host/Identity/RegisteredClient.h"

namespace palisade {

struct ClientMatch {
  /// The ID of the Flatpak application.
  std::optional<std::string> flatpak = std::nullopt;
  /// The name of the snap.
  std::optional<std::string> snap = std::nullopt;
  /// The application's ID in the unit's name, or the whole name of the unit.
  std::optional<std::string> unit = std::nullopt;
  /// An absolute path. Whatever file is there is the program, whichever of its names it was started by.
  std::optional<std::filesystem::path> executable = std::nullopt;

  bool isRecognisedByExecutable() const { return executable && !unit; }

  /// What a caller is at least, when it is recognised.
  ClientClass weakestClass() const;
};

/// What both would recognise, in words for an error message; none when no caller fits both.
std::optional<std::string> sharedMatch(const ClientMatch& one, const ClientMatch& other);

}  // namespace palisade

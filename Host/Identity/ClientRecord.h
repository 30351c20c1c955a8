#pragma once

/// What the administrator, or an application's package, says about the application: one TOML file.
///
///     bundle_id = "org.example.photos"
///     name = "Photos"
///     desktop_file = "org.example.photos.desktop"   # its name in the user's language goes before `name`
///     entitlements = ["com.example.an-entitlement"] # count only when the file and its folder are root's alone
///
///     [names]
///     de = "Fotos"
///
///     [match]
///     flatpak = "org.example.Photos"
///     executable = "/usr/bin/photos"
///
/// A name or a desktop file is needed, and one way in of `[match]` at least. Anything else in the file is a mistake: a misspelt
/// condition would otherwise let in more callers than meant.
/// Threads: plain values. Errors: `ClientRecordError` says which key is wrong and what it should be.

#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "Host/Identity/ClientMatch.h"
#include "Host/Identity/LocalizedText.h"
#include "Platform/Value.h"

namespace palisade {

class ClientRecordError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

struct ClientRecord {
  std::string bundleID;
  LocalizedText name = {};
  std::optional<std::string> desktopFile = std::nullopt;
  ClientMatch match = {};
  std::vector<std::string> entitlements = {};
  /// Where the record was read.
  std::filesystem::path file = {};
};

/// The record that the table of a file describes.
ClientRecord clientRecordFromTable(const Dictionary& table);

/// The application's name for the user, in the language that the environment names at this moment.
std::string localizedName(const ClientRecord& record);

}  // namespace palisade

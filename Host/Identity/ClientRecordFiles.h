#pragma once

/// The client records in the daemon's folders.
///
/// Threads: a plain function. Errors: none; what is wrong with a file is a trouble in words, and the other files still count.

#include <filesystem>
#include <string>
#include <vector>

#include "Host/Identity/ClientRecord.h"

namespace palisade {

struct ClientRecords {
  std::vector<ClientRecord> records;
  /// A line each: the file, what is wrong, what became of it.
  std::vector<std::string> troubles;
};

/// Reads `*.toml` in each folder, in the order of the file names. The first folder that describes a bundle ID decides about it.
/// Entitlements are kept only in files below `systemFolders` that root alone can have put there (see SystemFolder.h). A record
/// that cannot be read is left out, and so is one that recognises what an earlier one does.
ClientRecords readClientRecords(const std::vector<std::filesystem::path>& folders,
                                const std::vector<std::filesystem::path>& systemFolders = {});

}  // namespace palisade

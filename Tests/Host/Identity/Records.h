#pragma once

/// A folder of client records and programs that a test writes.

#include <filesystem>
#include <fstream>
#include <string>

#include "Tests/Host/TemporaryFolder.h"

class Records {
 public:
  const std::filesystem::path& path() const { return _folder.path(); }

  /// Writes a file into the folder; nobody but its owner may write it.
  std::filesystem::path write(const std::string& name, const std::string& content) const {
    const std::filesystem::path file = path() / name;
    std::ofstream(file, std::ios::binary) << content;
    std::filesystem::permissions(file, std::filesystem::perms(0644));
    return file;
  }

  /// A record of "org.example.photos" under that name, with a line or more of `[match]`.
  std::filesystem::path writePhotos(const std::string& match) const {
    return write("photos.toml", "bundle_id = 'org.example.photos'\nname = 'Photos'\n[match]\n" + match + "\n");
  }

  /// A copy of the program, in the folder under another name.
  std::filesystem::path copyProgram(const std::string& name) const {
    std::filesystem::copy_file(CALLER_PROGRAM, path() / name, std::filesystem::copy_options::overwrite_existing);
    return path() / name;
  }

  /// A line that matches an executable.
  static std::string executable(const std::filesystem::path& program) { return "executable = '" + program.string() + "'"; }

 private:
  TemporaryFolder _folder;
};

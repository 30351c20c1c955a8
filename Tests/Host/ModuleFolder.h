#pragma once

/// A plug-in folder of a test's own, with rights that a daemon accepts whatever the umask of the build was.

#include <filesystem>
#include <string>

#include "Tests/Host/TemporaryFolder.h"

class ModuleFolder {
 public:
  /// Copies a module of Tests/Host/Modules and answers the copy.
  std::filesystem::path install(const std::string& module) const;

  /// Writes a file of that content. Every file is a new one: a module that was loaded stays mapped.
  std::filesystem::path write(const std::string& fileName, const std::string& content) const;

  const std::filesystem::path& path() const { return _folder.path(); }

 private:
  TemporaryFolder _folder;
};

/// The bytes of a module of Tests/Host/Modules.
std::string moduleBytes(const std::string& module);

/// What the loader says when it refuses the file; empty when it loads it.
std::string refusalOf(const std::filesystem::path& file);

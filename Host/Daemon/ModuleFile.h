#pragma once

/// What can be said of a plug-in module's file without loading it.

#include <filesystem>

namespace palisade {

/// Throws `PluginLoadError` unless `file` is a complete shared object for this machine that, like its folder and the folders
/// above, only root and this process's user can change. `file` is absolute and without symbolic links.
///
/// "Complete" covers what the headers describe: every segment, and the section table, which linkers put at the end of the file.
/// What the segments hold is the dynamic linker's to judge.
void checkModuleFile(const std::filesystem::path& file);

/// Throws `PluginLoadError` with one sentence made of the file, what is wrong with it, and what to do.
[[noreturn]] void refuseModule(const std::filesystem::path& file, const std::string& problem, const std::string& advice);

}  // namespace palisade

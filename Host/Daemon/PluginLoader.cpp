#include "Host/Daemon/PluginLoader.h"

#include <dlfcn.h>

#include <string>
#include <system_error>

#include "Host/Daemon/ModuleFile.h"

namespace palisade {
namespace {

// The dynamic linker is given an absolute path: a bare file name would make it search the system's libraries.
std::filesystem::path resolved(const std::filesystem::path& path) {
  std::error_code problem;
  std::filesystem::path file = std::filesystem::canonical(path, problem);
  if (problem == std::errc::no_such_file_or_directory || problem == std::errc::not_a_directory) {
    refuseModule(path, "there is no such file", "correct the path or install the plug-in");
  }
  if (problem) refuseModule(path, "its path cannot be followed (" + problem.message() + ")", "correct the path");
  return file;
}

AccountAccessPluginModuleEntry entryOf(const std::filesystem::path& file) {
  void* const handle = dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
  if (handle == nullptr) {
    const char* const reason = dlerror();
    refuseModule(file, std::string("the dynamic linker refuses it (") + (reason != nullptr ? reason : "no reason given") + ")",
                 "install what it needs or a plug-in that was built for this system");
  }
  const auto entry = reinterpret_cast<AccountAccessPluginModuleEntry>(dlsym(handle, AccountAccessPluginModuleSymbol));
  if (entry == nullptr) {
    refuseModule(file, std::string("it does not export '") + AccountAccessPluginModuleSymbol + "'",
                 "name a plug-in module, or export the function if the module is your own");
  }
  return entry;
}

const AccountAccessPluginModule* answerOf(const std::filesystem::path& file, AccountAccessPluginModuleEntry entry) {
  const std::string function = std::string("its function '") + AccountAccessPluginModuleSymbol + "'";
  const AccountAccessPluginModule* module = nullptr;
  try {
    module = entry(AccountAccessPluginABINumber);
  } catch (...) {
    refuseModule(file, function + " threw an exception", "report this to the plug-in's maker");
  }
  if (module == nullptr) refuseModule(file, function + " answered nothing", "report this to the plug-in's maker");
  return module;
}

// Nothing behind the ABI number may be read before the numbers agree, and nothing behind the size before it suffices.
void checkModule(const std::filesystem::path& file, const AccountAccessPluginModule& module) {
  if (module.abiNumber != AccountAccessPluginABINumber) {
    refuseModule(file,
                 "it has ABI number " + std::to_string(module.abiNumber) + " and this daemon has " +
                     std::to_string(AccountAccessPluginABINumber),
                 "install a plug-in and a daemon of the same release");
  }
  if (module.size < sizeof(AccountAccessPluginModule)) {
    refuseModule(file,
                 "its description of itself has " + std::to_string(module.size) + " bytes and this daemon needs " +
                     std::to_string(sizeof(AccountAccessPluginModule)),
                 "build it again with this daemon's headers");
  }
  const auto require = [&file](bool isThere, const std::string& function) {
    if (!isThere) refuseModule(file, "it lacks the function '" + function + "'", "report this to the plug-in's maker");
  };
  require(module.supportsAccountTypeWithIdentifier != nullptr, "supportsAccountTypeWithIdentifier");
  require(module.create != nullptr, "create");
}

}  // namespace

LoadedPlugin loadPlugin(const std::filesystem::path& path) {
  std::filesystem::path file = resolved(path);
  checkModuleFile(file);
  const AccountAccessPluginModule* const module = answerOf(file, entryOf(file));
  checkModule(file, *module);
  return {.path = std::move(file), .module = module};
}

}  // namespace palisade

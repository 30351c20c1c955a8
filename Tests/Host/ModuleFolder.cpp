#include "Tests/Host/ModuleFolder.h"

#include <fstream>
#include <iterator>

#include "Host/Daemon/PluginLoader.h"

std::string moduleBytes(const std::string& module) {
  std::ifstream file(std::filesystem::path(MODULES_FOLDER) / (module + ".so"), std::ios::binary);
  if (!file) throw std::runtime_error("There is no test module " + module + ".");
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

std::filesystem::path ModuleFolder::install(const std::string& module) const {
  return write(module + ".so", moduleBytes(module));
}

std::filesystem::path ModuleFolder::write(const std::string& fileName, const std::string& content) const {
  using std::filesystem::perms;
  const std::filesystem::path file = path() / fileName;
  std::filesystem::remove(file);
  std::ofstream(file, std::ios::binary) << content;
  std::filesystem::permissions(file, perms::owner_read | perms::owner_write | perms::group_read | perms::others_read);
  return file;
}

std::string refusalOf(const std::filesystem::path& file) {
  try {
    palisade::loadPlugin(file);
    return {};
  } catch (const palisade::PluginLoadError& error) {
    return error.what();
  }
}

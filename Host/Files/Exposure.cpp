#include "Host/Files/Exposure.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <string_view>
#include <system_error>

namespace palisade {
namespace {

// Whom the kernel names as the owner of what belongs to nobody in this user namespace; none where everybody is in it.
std::optional<uid_t> ownerOfUnmapped() {
  std::ifstream map("/proc/self/uid_map");
  unsigned long inside = 0;
  unsigned long outside = 0;
  unsigned long count = 0;
  constexpr unsigned long everybody = 4294967295;
  if (map >> inside >> outside >> count && count == everybody) return std::nullopt;
  std::ifstream overflow("/proc/sys/kernel/overflowuid");
  uid_t owner = 0;
  return overflow >> owner ? std::optional(owner) : std::nullopt;
}

// Many systems give each user a group of the user's name, without other members, and let that group write what the user makes.
bool isPrivateGroupOfThisUser(gid_t group) {
  std::array<char, 4096> userTexts{};
  std::array<char, 4096> groupTexts{};
  passwd userEntry{};
  ::group groupEntry{};
  passwd* user = nullptr;
  ::group* found = nullptr;
  if (getpwuid_r(geteuid(), &userEntry, userTexts.data(), userTexts.size(), &user) != 0 || user == nullptr) return false;
  if (getgrgid_r(group, &groupEntry, groupTexts.data(), groupTexts.size(), &found) != 0 || found == nullptr) return false;
  if (user->pw_gid != group || std::string_view(user->pw_name) != found->gr_name) return false;
  for (char** member = found->gr_mem; *member != nullptr; ++member) {
    if (std::string_view(*member) != user->pw_name) return false;
  }
  return true;
}

std::string quoted(const std::filesystem::path& path) { return "'" + path.string() + "'"; }

Exposure unexaminable(const std::filesystem::path& path) {
  return {
      .path = path, .problem = std::string("cannot be examined: ") + std::strerror(errno), .remedy = "ls -ld " + quoted(path)};
}

std::optional<Exposure> exposureAt(const std::filesystem::path& path) {
  struct stat status {};
  return stat(path.c_str(), &status) == 0 ? exposureOf(path, status) : unexaminable(path);
}

}  // namespace

std::optional<Exposure> exposureOf(const std::filesystem::path& path, const struct stat& status) {
  if (status.st_uid != 0 && status.st_uid != geteuid() && status.st_uid != ownerOfUnmapped()) {
    return Exposure{.path = path,
                    .problem = "belongs to another user (user ID " + std::to_string(status.st_uid) + ")",
                    .remedy = "chown root " + quoted(path)};
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    return Exposure{.path = path, .problem = "is writable by other users", .remedy = "chmod go-w " + quoted(path)};
  }
  return std::nullopt;
}

std::optional<Exposure> exposureOfFile(const std::filesystem::path& file) {
  std::error_code error;
  if (!std::filesystem::exists(std::filesystem::symlink_status(file, error))) return std::nullopt;
  if (const auto folder = exposureAt(file.parent_path())) return folder;
  const auto place = std::filesystem::canonical(file, error);
  // A link to nowhere is no file.
  if (error) return std::nullopt;
  if (const auto folder = exposureAt(place.parent_path())) return folder;
  return exposureAt(place);
}

std::optional<Exposure> exposureAbove(const std::filesystem::path& path) {
  for (std::filesystem::path folder = path.parent_path();; folder = folder.parent_path()) {
    struct stat status {};
    if (stat(folder.c_str(), &status) != 0) return unexaminable(folder);
    if ((status.st_mode & S_ISVTX) != 0) status.st_mode &= ~static_cast<mode_t>(S_IWGRP | S_IWOTH);
    if ((status.st_mode & S_IWGRP) != 0 && isPrivateGroupOfThisUser(status.st_gid)) {
      status.st_mode &= ~static_cast<mode_t>(S_IWGRP);
    }
    if (const auto exposure = exposureOf(folder, status)) return exposure;
    if (folder == folder.root_path()) return std::nullopt;
  }
}

}  // namespace palisade

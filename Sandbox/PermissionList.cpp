#include "Sandbox/PermissionList.h"

#include <fstream>
#include <stdexcept>

namespace palisade::sandbox {
namespace {

struct BuiltIn {
  std::string_view name;
  std::string_view words = {};
};

// Kinds of things of which there is one permission for the user's own and one for the friends'.
constexpr std::string_view pairs[] = {
    "checkins",      "events",
    "groups",        "likes",
    "notes",         "photos",
    "status",        "videos",
    "questions",     "location",
    "birthday",      "relationships",
    "website",       "relationship_details",
    "about_me",      "online_presence",
    "hometown",      "activities",
    "interests",     "religion_politics",
    "subscriptions", "education_history",
    "work_history",
};

constexpr BuiltIn single[] = {
    {"basic_info"},
    {"friends"},
    {"current_city"},
    {"email"},
    {"read_friendlists"},
    {"read_requests"},
    {"read_mailbox"},
    {"read_stream"},
    {"read_insights"},
    {"publish_actions"},
    {"publish_stream"},
    {"publish_checkins"},
    {"publish"},
    {"ads_management"},
    {"create_event"},
    {"rsvp_event"},
    {"xmpp_login"},
    {"manage_friendlists"},
    {"manage_notifications"},
    {"manage_pages"},
    // Newer than the clients' catalogue: clients ask the server to describe these.
    {"user_playlists", "your playlists"},
    {"user_runs", "the runs that you recorded"},
    {"user_bookshelf", "the books that you read"},
};

}  // namespace

PermissionList PermissionList::builtIn() {
  PermissionList list;
  for (const std::string_view kind : pairs) {
    list.add("user_" + std::string(kind), {});
    list.add("friends_" + std::string(kind), {});
  }
  for (const BuiltIn& permission : single) list.add(permission.name, permission.words);
  return list;
}

PermissionList PermissionList::fromFile(const std::filesystem::path& path) {
  std::ifstream file(path);
  if (!file) throw std::runtime_error("The permissions cannot be read from " + path.string() + ".");
  PermissionList list;
  std::string line;
  for (std::size_t number = 1; std::getline(file, line); ++number) {
    if (line.empty() || line.front() == '#') continue;
    const std::size_t nameEnd = line.find_first_of(" \t");
    if (nameEnd == 0) {
      throw std::runtime_error(path.string() + ", line " + std::to_string(number) +
                               ": the line begins with no permission's name.");
    }
    const std::size_t wordsBegin = line.find_first_not_of(" \t", nameEnd);
    list.add(line.substr(0, nameEnd), wordsBegin == std::string::npos ? std::string() : line.substr(wordsBegin));
  }
  return list;
}

std::optional<std::string> PermissionList::wordsFor(std::string_view name) const {
  const auto found = _words.find(name);
  if (found == _words.end() || found->second.empty()) return std::nullopt;
  return found->second;
}

void PermissionList::add(std::string_view name, std::string_view words) { _words.insert_or_assign(std::string(name), words); }

}  // namespace palisade::sandbox

#pragma once

/// The permissions that the plug-in has to know, written down a second time: a name that is lost, misspelt or filed elsewhere
/// in the catalogue differs from this copy.

#include <cctype>
#include <string>
#include <vector>

namespace palisade::known {

inline const std::vector<std::string> basicRead{
    "basic_info", "current_city", "email", "friends", "user_birthday", "user_location",
};

inline const std::vector<std::string> userRead{
    "user_about_me",        "user_activities",
    "user_checkins",        "user_education_history",
    "user_events",          "user_groups",
    "user_hometown",        "user_interests",
    "user_likes",           "user_notes",
    "user_online_presence", "user_photos",
    "user_questions",       "user_relationship_details",
    "user_relationships",   "user_religion_politics",
    "user_status",          "user_subscriptions",
    "user_videos",          "user_website",
    "user_work_history",
};

inline const std::vector<std::string> friendsRead{
    "friends_about_me",
    "friends_activities",
    "friends_birthday",
    "friends_checkins",
    "friends_education_history",
    "friends_events",
    "friends_groups",
    "friends_hometown",
    "friends_interests",
    "friends_likes",
    "friends_location",
    "friends_notes",
    "friends_online_presence",
    "friends_photos",
    "friends_questions",
    "friends_relationship_details",
    "friends_relationships",
    "friends_religion_politics",
    "friends_status",
    "friends_subscriptions",
    "friends_videos",
    "friends_website",
    "friends_work_history",
};

inline const std::vector<std::string> loneRead{
    "read_friendlists", "read_insights", "read_mailbox", "read_requests", "read_stream",
};

inline const std::vector<std::string> write{
    "publish",
    "publish_actions",
    "publish_checkins",
    "publish_stream",
};

inline const std::vector<std::string> manage{
    "ads_management", "create_event", "manage_friendlists", "manage_notifications", "manage_pages", "rsvp_event", "xmpp_login",
};

/// The user's profile in detail.
inline const std::vector<std::string> userProfile{
    "user_about_me",  "user_activities",    "user_education_history", "user_hometown",
    "user_interests", "user_subscriptions", "user_website",           "user_work_history",
};

inline std::vector<std::string> together(std::initializer_list<std::vector<std::string>> lists) {
  std::vector<std::string> all;
  for (const auto& list : lists) all.insert(all.end(), list.begin(), list.end());
  return all;
}

/// The name as it stands in the key of an object's name.
inline std::string upperCased(std::string name) {
  for (char& letter : name) letter = static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
  return name;
}

inline std::vector<std::string> extendedRead() { return together({userRead, friendsRead, loneRead}); }
inline std::vector<std::string> read() { return together({basicRead, extendedRead()}); }

}  // namespace palisade::known

// The fixed catalogue of Facebook permissions in four categories.
//
// Every decision that depends on what a permission means rests on these lists. A name in none of them is unknown; nothing is
// added at run time. No name stands in two lists.

#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Facebook/Palisade/VXFacebookPermissionCategories.h"

namespace palisade {
namespace {

constexpr std::string_view basicReadNames[] = {
    "basic_info", "friends", "user_location", "user_birthday", "current_city", "email",
};

// Most objects come as a pair. The user's own location and birthday are basic, their friends' are not.
constexpr std::string_view extendedReadNames[] = {
    "user_checkins",
    "friends_checkins",
    "user_events",
    "friends_events",
    "user_groups",
    "friends_groups",
    "user_likes",
    "friends_likes",
    "user_notes",
    "friends_notes",
    "user_photos",
    "friends_photos",
    "user_status",
    "friends_status",
    "user_videos",
    "friends_videos",
    "user_questions",
    "friends_questions",
    "user_online_presence",
    "friends_online_presence",
    "user_relationships",
    "friends_relationships",
    "user_relationship_details",
    "friends_relationship_details",
    "user_religion_politics",
    "friends_religion_politics",
    "user_about_me",
    "friends_about_me",
    "user_activities",
    "friends_activities",
    "user_education_history",
    "friends_education_history",
    "user_hometown",
    "friends_hometown",
    "user_interests",
    "friends_interests",
    "user_subscriptions",
    "friends_subscriptions",
    "user_website",
    "friends_website",
    "user_work_history",
    "friends_work_history",
    "friends_birthday",
    "friends_location",
    "read_friendlists",
    "read_requests",
    "read_mailbox",
    "read_stream",
    "read_insights",
};

constexpr std::string_view writeNames[] = {
    "publish_actions",
    "publish_stream",
    "publish_checkins",
    "publish",
};

constexpr std::string_view manageNames[] = {
    "ads_management", "create_event", "rsvp_event", "xmpp_login", "manage_friendlists", "manage_notifications", "manage_pages",
};

// The user's own profile in detail, described together as the basic profile when asked for beside a basic read permission.
constexpr std::string_view userProfileReadNames[] = {
    "user_about_me",  "user_activities",    "user_education_history", "user_hometown",
    "user_interests", "user_subscriptions", "user_website",           "user_work_history",
};

}  // namespace

const PermissionSet& VXFacebookAccountAccessPlugin::_basicReadPermissions() const {
  return _sets._basicReadPermissions.filledWith(basicReadNames);
}

const PermissionSet& VXFacebookAccountAccessPlugin::_extendedReadPermissions() const {
  return _sets._extendedReadPermissions.filledWith(extendedReadNames);
}

const PermissionSet& VXFacebookAccountAccessPlugin::_writePermissions() const {
  return _sets._writePermissions.filledWith(writeNames);
}

const PermissionSet& VXFacebookAccountAccessPlugin::_managePermissions() const {
  return _sets._managePermissions.filledWith(manageNames);
}

PermissionSet VXFacebookAccountAccessPlugin::_allReadPermissions() const {
  PermissionSet readPermissions = _extendedReadPermissions();
  readPermissions.insert(_basicReadPermissions().begin(), _basicReadPermissions().end());
  return readPermissions;
}

PermissionSet VXFacebookAccountAccessPlugin::_userProfileReadPermissions() const {
  return permissionSetOfNames(userProfileReadNames);
}

const PermissionSet* VXFacebookAccountAccessPlugin::_allPermissionsInCategory(std::optional<std::string_view> category) const {
  if (category == VXFacebookPermissionCategoryBasicRead) return &_basicReadPermissions();
  if (category == VXFacebookPermissionCategoryExtendedRead) return &_extendedReadPermissions();
  if (category == VXFacebookPermissionCategoryWrite) return &_writePermissions();
  if (category == VXFacebookPermissionCategoryManage) return &_managePermissions();
  return nullptr;
}

}  // namespace palisade

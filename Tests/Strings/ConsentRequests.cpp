#include "Tests/Strings/ConsentRequests.h"

#include <set>
#include <string_view>

#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

struct Choice {
  std::string_view title;
  std::vector<std::string> permissions;
};

const std::vector<Choice> thingsOfTheUser{
    {"nothing of the user", {}},
    {"the user's basics", {"email"}},
    {"one thing of the user", {"user_photos"}},
    {"two things of the user", {"user_photos", "user_religion_politics"}},
    {"the user's basics and one thing", {"basic_info", "read_mailbox"}},
    {"the user's basics and friend lists", {"basic_info", "read_friendlists"}},
    {"the user's basics and many things",
     {"user_location", "user_events", "user_online_presence", "user_status", "read_stream"}},
    {"the user's profile in detail", {"basic_info", "user_about_me", "user_hometown", "user_work_history"}},
};

const std::vector<Choice> thingsOfFriends{
    {"nothing of friends", {}},
    {"one thing of friends", {"friends_birthday"}},
    {"two things of friends", {"friends_photos", "friends_location"}},
    {"many things of friends", {"friends_about_me", "friends_likes", "friends_religion_politics", "friends_website"}},
};

const std::vector<Choice> managing{
    {"nothing to manage", {}},
    {"one thing to manage", {"manage_pages"}},
    {"two things to manage", {"create_event", "rsvp_event"}},
    {"many things to manage", {"ads_management", "xmpp_login", "manage_friendlists", "manage_notifications"}},
};

struct Posting {
  Choice choice;
  std::optional<std::string> audience;
};

const std::vector<Posting> posting{
    {{"no posts", {}}, std::nullopt},
    {{"posts for everyone", {"publish_actions"}}, std::string(FacebookAudienceEveryone)},
    {{"posts for friends", {"publish_stream"}}, std::string(FacebookAudienceFriends)},
    {{"posts for the user alone", {"publish_checkins", "publish"}}, std::string(FacebookAudienceOnlyMe)},
};

const std::vector<Choice> unknown{
    {"nothing unknown", {}},
    {"something that only Facebook knows", {permissionThatOnlyTheServerKnows}},
};

void add(ConsentRequest& request, const Choice& choice) {
  request.permissions.insert(choice.permissions.begin(), choice.permissions.end());
  if (!request.title.empty()) request.title += "; ";
  request.title += choice.title;
}

}  // namespace

std::vector<ConsentRequest> requestsForEachOf(const PermissionSet& permissions) {
  const std::set<std::string> sorted(permissions.begin(), permissions.end());
  std::vector<ConsentRequest> requests;
  for (const std::string& name : sorted) requests.push_back({.title = name, .permissions = {name}});
  return requests;
}

std::vector<ConsentRequest> requestsOfEveryShape() {
  std::vector<ConsentRequest> requests;
  for (const Choice& described : unknown) {
    for (const Choice& managed : managing) {
      for (const Posting& posted : posting) {
        for (const Choice& friends : thingsOfFriends) {
          for (const Choice& user : thingsOfTheUser) {
            ConsentRequest request;
            add(request, user);
            add(request, friends);
            add(request, posted.choice);
            add(request, managed);
            add(request, described);
            request.audience = posted.audience;
            requests.push_back(std::move(request));
          }
        }
      }
    }
  }
  return requests;
}

}  // namespace palisade

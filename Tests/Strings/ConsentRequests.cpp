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
    {},
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
    {},
    {"one thing of friends", {"friends_birthday"}},
    {"two things of friends", {"friends_photos", "friends_location"}},
    {"many things of friends", {"friends_about_me", "friends_likes", "friends_religion_politics", "friends_website"}},
};

const std::vector<Choice> managing{
    {},
    {"one thing to manage", {"manage_pages"}},
    {"two things to manage", {"create_event", "rsvp_event"}},
    {"many things to manage", {"ads_management", "xmpp_login", "manage_friendlists", "manage_notifications"}},
};

struct Posting {
  Choice choice;
  std::optional<std::string> audience;
};

const std::vector<Posting> posting{
    {},
    {{"posts for everyone", {"publish_actions"}}, std::string(FacebookAudienceEveryone)},
    {{"posts for friends", {"publish_stream"}}, std::string(FacebookAudienceFriends)},
    {{"posts for the user alone", {"publish_checkins", "publish"}}, std::string(FacebookAudienceOnlyMe)},
};

const std::vector<Choice> unknown{
    {},
    {"something that only Facebook knows", {permissionThatOnlyTheServerKnows}},
};

void add(ConsentRequest& request, const Choice& choice) {
  if (choice.permissions.empty()) return;
  request.permissions.insert(choice.permissions.begin(), choice.permissions.end());
  if (!request.title.empty()) request.title += "; ";
  request.title += choice.title;
}

/// What a request asks for, as places in the lists above. None asks for anything at place 0.
struct Shape {
  std::size_t user;
  std::size_t friends;
  std::size_t posted;
  std::size_t managed;
  std::size_t described;
};

ConsentRequest requestOfShape(const Shape& shape) {
  ConsentRequest request;
  add(request, thingsOfTheUser[shape.user]);
  add(request, thingsOfFriends[shape.friends]);
  add(request, posting[shape.posted].choice);
  add(request, managing[shape.managed]);
  add(request, unknown[shape.described]);
  if (request.title.empty()) request.title = "the account alone";
  request.audience = posting[shape.posted].audience;
  return request;
}

template <typename Predicate>
std::vector<ConsentRequest> requestsWhere(Predicate isWanted) {
  std::vector<ConsentRequest> requests;
  for (std::size_t described = 0; described < unknown.size(); ++described) {
    for (std::size_t managed = 0; managed < managing.size(); ++managed) {
      for (std::size_t posted = 0; posted < posting.size(); ++posted) {
        for (std::size_t friends = 0; friends < thingsOfFriends.size(); ++friends) {
          for (std::size_t user = 0; user < thingsOfTheUser.size(); ++user) {
            const Shape shape{user, friends, posted, managed, described};
            if (isWanted(shape)) requests.push_back(requestOfShape(shape));
          }
        }
      }
    }
  }
  return requests;
}

}  // namespace

std::vector<ConsentRequest> requestsForEachOf(const PermissionSet& permissions) {
  const std::set<std::string> sorted(permissions.begin(), permissions.end());
  std::vector<ConsentRequest> requests;
  for (const std::string& name : sorted) requests.push_back({.title = name, .permissions = {name}});
  return requests;
}

std::vector<ConsentRequest> requestsOfEveryShape() {
  return requestsWhere([](const Shape&) { return true; });
}

std::vector<ConsentRequest> requestsForReview() {
  return requestsWhere([](const Shape& shape) {
    const bool readsNothing = shape.user == 0 && shape.friends == 0;
    const bool readsTwoThings = shape.user == 3;
    if (shape.described > 0) {
      return (readsNothing || (readsTwoThings && shape.friends == 0)) && shape.posted <= 1 && shape.managed <= 1;
    }
    if (shape.posted == 0 && shape.managed == 0) return true;
    return readsNothing || (readsTwoThings && (shape.friends == 0 || shape.friends == 3));
  });
}

}  // namespace palisade

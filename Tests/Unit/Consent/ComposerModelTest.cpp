// Random requests, compared with a plain model of the consent message that knows nothing of the plug-in's code.

#include <gmock/gmock.h>

#include <random>

#include "Tests/Unit/Consent/ConsentScene.h"
#include "Tests/Unit/Consent/KnownPermissions.h"

namespace palisade {
namespace {

struct Request {
  std::set<std::string> permissions;
  std::optional<std::string> audience;
  /// The server's words for what is in no list; none when it has none.
  std::optional<std::string> description;
};

bool isIn(const std::vector<std::string>& list, const std::string& name) { return std::ranges::find(list, name) != list.end(); }

std::vector<std::string> thoseIn(const std::vector<std::string>& list, const std::set<std::string>& permissions) {
  std::vector<std::string> found;
  std::ranges::copy_if(permissions, std::back_inserter(found), [&](const auto& name) { return isIn(list, name); });
  return found;
}

std::string joinedButLast(const std::vector<std::string>& names) {
  std::string list;
  for (std::size_t index = 0; index + 1 < names.size(); ++index) {
    list += (index == 0 ? "" : text("WORD_LIST_SEPARATOR")) + names[index];
  }
  return list;
}

std::string listOf(const std::string& key, const std::string& multipleKey, const std::vector<std::string>& names) {
  if (names.size() == 1) return shown(key, {names.front()});
  return shown(multipleKey, {joinedButLast(names), names.back()});
}

std::vector<std::string> objectNames(std::vector<std::string> permissions, std::string (*name)(std::string_view)) {
  for (std::string& permission : permissions) permission = name(known::upperCased(permission));
  std::ranges::sort(permissions);
  return permissions;
}

std::optional<std::string> readPhrase(const Request& request) {
  std::vector<std::string> user =
      objectNames(thoseIn(known::together({known::userRead, known::loneRead}), request.permissions), readName);
  const std::vector<std::string> friends = objectNames(thoseIn(known::friendsRead, request.permissions), readName);
  const bool wantsBasics = !thoseIn(known::basicRead, request.permissions).empty();
  const bool wantsDetails = !thoseIn(known::userProfile, request.permissions).empty();
  if (wantsBasics && !wantsDetails) user.insert(user.begin(), {readName("BASIC_PROFILE"), readName("FRIENDS")});

  std::vector<std::string> sides;
  const std::string key = "ACCOUNT_ACCESS_EXTENDED_READ";
  if (!user.empty()) sides.push_back(listOf(key + "_USER", key + "_USER_MULTIPLE", user));
  if (!friends.empty()) sides.push_back(listOf(key + "_FRIENDS", key + "_FRIENDS_MULTIPLE", friends));
  if (sides.empty()) return std::nullopt;
  return sides.size() == 1 ? shown(key, {sides[0]}) : shown(key + "_MULTIPLE", {sides[0], sides[1]});
}

std::optional<std::string> modelOf(const Request& request) {
  std::vector<std::string> phrases;
  if (auto phrase = readPhrase(request)) phrases.push_back(*phrase);
  const bool writes = !thoseIn(known::write, request.permissions).empty();
  if (writes) {
    const std::string audience = request.audience == "FacebookAudienceFriends"  ? "POST_TO_FRIENDS"
                                 : request.audience == "FacebookAudienceOnlyMe" ? "POST_PRIVATELY"
                                                                                : "POST_PUBLICALLY";
    phrases.push_back(shown("ACCCOUNT_ACCESS_WRITE", {text(audience)}));
  }
  const auto managed = objectNames(thoseIn(known::manage, request.permissions), manageName);
  if (!managed.empty()) phrases.push_back(listOf("ACCOUNT_ACCESS_MANAGE", "ACCOUNT_ACCESS_MANAGE_MULTIPLE", managed));

  const auto listed = thoseIn(known::together({known::read(), known::write, known::manage}), request.permissions);
  const bool hasUnlisted = listed.size() < request.permissions.size();
  if (hasUnlisted && !request.description) return std::nullopt;
  if (hasUnlisted && phrases.empty()) return shown("ACCOUNT_ACCESS_UNKNOWN_FORMAT", {"Photos", *request.description});

  const bool onlyReads = !writes && managed.empty() && !hasUnlisted;
  std::string sentence;
  switch (phrases.size()) {
    case 0: sentence = shown("ACCOUNT_ACCESS_BASIC_MESSAGE", {"Photos"}); break;
    case 1:
      sentence = shown(onlyReads ? "ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT" : "ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT",
                       {"Photos", phrases[0]});
      break;
    case 2: sentence = shown("ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT", {"Photos", phrases[0], phrases[1]}); break;
    default: sentence = shown("ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT", {"Photos", phrases[0], phrases[1], phrases[2]}); break;
  }
  if (hasUnlisted) sentence += " " + shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {*request.description});
  return sentence;
}

class RandomRequests {
 public:
  explicit RandomRequests(unsigned seed) : _random(seed) {}

  Request next() {
    Request request;
    const std::vector<std::string> junk{"",         "Email",       "email ",  "user_zebra",   "friends_zebra",
                                        "friends_", "publish_all", "unknown", "write",        "%@",
                                        "%d %%",    "a\nb",        "\xff",    "basic_profile"};
    // Each kind is left out of many requests, so that every combination of kinds comes up often.
    for (const auto* kind :
         {&known::basicRead, &known::userRead, &known::friendsRead, &known::loneRead, &known::write, &known::manage, &junk}) {
      if (below(2) == 0) continue;
      for (auto count = below(4) + (below(10) == 0 ? kind->size() : 0); count > 0; --count) {
        request.permissions.insert((*kind)[below(kind->size())]);
      }
    }
    const std::optional<std::string> audiences[] = {
        std::nullopt, "FacebookAudienceEveryone", "FacebookAudienceFriends", "FacebookAudienceOnlyMe", "", "SELF"};
    request.audience = audiences[below(std::size(audiences))];
    const std::optional<std::string> descriptions[] = {"new things", "%@ and %d", std::nullopt};
    request.description = descriptions[below(std::size(descriptions))];
    return request;
  }

 private:
  std::size_t below(std::size_t bound) { return _random() % bound; }

  std::mt19937_64 _random;
};

TEST(AnyRequest, GetsTheMessageOfThePlainModel) {
  ConsentScene scene;
  RandomRequests requests(20250102);
  std::set<std::string> sentences;
  for (int round = 0; round < 1500; ++round) {
    const Request request = requests.next();
    // An answer in line: thousands of threads would say no more.
    scene.platform.social.descriptionAnswers = {
        {.data = compactJson(Value(request.description.value_or("API_EC_PARAM"))), .delivery = Delivery::inLine}};

    const auto message = scene.plugin->_constructUserMessageForPermissions(
        {request.permissions.begin(), request.permissions.end()}, request.audience, "Photos", scene.account);

    ASSERT_EQ(message, modelOf(request)) << "round " << round << ": " << ::testing::PrintToString(request.permissions);
    if (message) sentences.insert(message->substr(0, message->find('<')));
    scene.platform.trace.clear();
  }
  EXPECT_EQ(sentences.size(), 6u) << "Every kind of sentence has to come up.";
}

}  // namespace
}  // namespace palisade

// What the plug-in itself costs, beside the least that such work can cost: a set of ten permission names, built and intersected
// with the catalogue. Times are the processor's; each benchmark also counts its allocations.

#include <benchmark/benchmark.h>
#include <unistd.h>

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Benchmarks/CountedAllocations.h"
#include "Benchmarks/FigureTable.h"
#include "Benchmarks/InMemoryServices.h"
#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"

namespace palisade {
namespace {

class MeasuredPlugin final : public VXFacebookAccountAccessPlugin {
 public:
  using VXFacebookAccountAccessPlugin::VXFacebookAccountAccessPlugin;

  using VXFacebookAccountAccessPlugin::_allReadPermissions;
  using VXFacebookAccountAccessPlugin::_constructUserMessageForPermissions;
  using VXFacebookAccountAccessPlugin::_predicateForPermissions;
  using VXFacebookAccountAccessPlugin::_validateOptionsDictionary;
};

// Of every kind that the catalogue knows, short names and long ones.
constexpr std::string_view tenNames[] = {
    "email",          "user_birthday", "user_likes",      "user_photos",  "friends_relationship_details",
    "friends_photos", "read_mailbox",  "publish_actions", "manage_pages", "manage_notifications",
};

// The ten names and, beyond them, names that no list knows.
std::vector<std::string> permissionNames(std::size_t count) {
  std::vector<std::string> names(std::begin(tenNames), std::end(tenNames));
  while (names.size() < count) names.push_back("user_made_up_thing_" + std::to_string(names.size()));
  return names;
}

PermissionSet permissionSet(std::size_t count) {
  const std::vector<std::string> names = permissionNames(count);
  return {names.begin(), names.end()};
}

std::shared_ptr<const Dictionary> optionsAskingFor(std::size_t count) {
  const std::vector<std::string> names = permissionNames(count);
  return std::make_shared<const Dictionary>(Dictionary{{std::string(FacebookAppIdKey), "1234567890"},
                                                       {std::string(FacebookPermissionsKey), Array(names.begin(), names.end())},
                                                       {std::string(FacebookAudienceKey), FacebookAudienceEveryone}});
}

InMemoryServices& platform() {
  static auto& services = *new InMemoryServices;
  return services;
}

const std::shared_ptr<MeasuredPlugin>& plugin() {
  static const auto& object = *new auto(std::make_shared<MeasuredPlugin>(platform().services()));
  return object;
}

// Repeats `operation` as long as the benchmark asks for, and counts what it allocates.
template <typename Operation>
void measure(benchmark::State& state, const Operation& operation) {
  const std::uint64_t before = allocationsSoFar();
  for (auto _ : state) operation();
  state.counters["allocations"] =
      benchmark::Counter(static_cast<double>(allocationsSoFar() - before), benchmark::Counter::kAvgIterations);
}

std::size_t sizeOf(const benchmark::State& state) { return static_cast<std::size_t>(state.range(0)); }

void SetOfTenNamesBuiltAndIntersected(benchmark::State& state) {
  const PermissionSet catalogue = [] {
    PermissionSet all = plugin()->_allReadPermissions();
    for (const char* const name :
         {"publish_actions", "publish_stream", "publish_checkins", "publish", "ads_management", "create_event", "rsvp_event",
          "xmpp_login", "manage_friendlists", "manage_notifications", "manage_pages"}) {
      all.insert(name);
    }
    return all;
  }();
  measure(state, [&] {
    const PermissionSet names = permissionSetOfNames(tenNames);
    PermissionSet common = intersection(names, catalogue);
    benchmark::DoNotOptimize(common);
  });
}
BENCHMARK(SetOfTenNamesBuiltAndIntersected);

// Carries out requests for the benchmark's number of permissions and makes sure that each ends as it has to.
void measureRequests(benchmark::State& state, std::shared_ptr<const ClientAuthorization> record, bool shallBeGranted) {
  const auto type = std::make_shared<const AccountType>(std::string(AccountTypeIdentifierFacebook));
  const auto client = platform().makeClient();
  const auto options = optionsAskingFor(sizeOf(state));
  const auto store = platform().makeStore(std::move(record));
  std::size_t requests = 0;
  std::size_t rightAnswers = 0;
  measure(state, [&] {
    ++requests;
    plugin()->handleAccessRequestToAccountsOfType(
        type, client, options, store, true,
        [&](bool granted, const std::optional<Error>&) { rightAnswers += granted == shallBeGranted ? 1 : 0; });
  });
  if (rightAnswers != requests) state.SkipWithError("A request did not end as it has to.");
}

void RequestAnsweredFromAnEarlierGrant(benchmark::State& state) {
  const auto record = std::make_shared<ClientAuthorization>(platform().makeClient());
  record->setIsGranted(true);
  record->setOptions(optionsAskingFor(0));
  record->setGrantedPermissions(std::make_shared<const PermissionSet>(permissionSet(sizeOf(state))));
  measureRequests(state, record, true);
}

void RequestRefusedAtThePrompt(benchmark::State& state) {
  platform().answerAlertsWith(1);
  measureRequests(state, nullptr, false);
}

void RequestAllowedAtThePrompt(benchmark::State& state) {
  platform().answerAlertsWith(AlertResponseDefaultButton);
  measureRequests(state, nullptr, true);
}

void ValidationOfOptions(benchmark::State& state) {
  const auto options = optionsAskingFor(sizeOf(state));
  measure(state, [&] { benchmark::DoNotOptimize(plugin()->_validateOptionsDictionary(options.get())); });
}

void ConsentSentence(benchmark::State& state) {
  const PermissionSet permissions = permissionSet(sizeOf(state));
  const auto account = platform().makeAccount();
  measure(state, [&] {
    auto message = plugin()->_constructUserMessageForPermissions(permissions, std::nullopt, "Photos", account);
    benchmark::DoNotOptimize(message);
  });
}

void PhraseForFiftyFiveReadPermissions(benchmark::State& state) {
  const PermissionSet permissions = plugin()->_allReadPermissions();
  if (permissions.size() != 55) state.SkipWithError("The catalogue has another number of read permissions.");
  measure(state, [&] {
    auto phrase = plugin()->_predicateForPermissions(permissions, "extended-read", std::nullopt);
    benchmark::DoNotOptimize(phrase);
  });
}
BENCHMARK(PhraseForFiftyFiveReadPermissions);

constexpr int smallest = 10;
constexpr int largest = 10'000;
BENCHMARK(RequestAnsweredFromAnEarlierGrant)->RangeMultiplier(10)->Range(smallest, largest);
BENCHMARK(RequestRefusedAtThePrompt)->RangeMultiplier(10)->Range(smallest, largest);
BENCHMARK(RequestAllowedAtThePrompt)->RangeMultiplier(10)->Range(smallest, largest);
BENCHMARK(ValidationOfOptions)->RangeMultiplier(10)->Range(smallest, largest);
BENCHMARK(ConsentSentence)->RangeMultiplier(10)->Range(smallest, largest);

}  // namespace
}  // namespace palisade

int main(int argumentCount, char** arguments) {
  // Five short repetitions find a quiet moment on a busy machine more surely than a long one. Options of the caller come last
  // and win.
  std::vector<char*> all{arguments, arguments + 1};
  std::string defaults[] = {"--benchmark_repetitions=5", "--benchmark_min_time=0.05"};
  for (std::string& option : defaults) all.push_back(option.data());
  all.insert(all.end(), arguments + 1, arguments + argumentCount);
  int count = static_cast<int>(all.size());
  all.push_back(nullptr);

  benchmark::Initialize(&count, all.data());
  if (benchmark::ReportUnrecognizedArguments(count, all.data())) return 1;
  palisade::FastestRuns runs(isatty(STDOUT_FILENO) == 1 ? benchmark::ConsoleReporter::OO_ColorTabular
                                                        : benchmark::ConsoleReporter::OO_Tabular);
  benchmark::RunSpecifiedBenchmarks(&runs);
  benchmark::Shutdown();
  palisade::printFigures(runs);
}

#include "Sandbox/ControlClient.h"

#include <httplib.h>

#include <fstream>
#include <stdexcept>

namespace palisade::sandbox {
namespace {

httplib::Result ask(httplib::Client& client, const Options& options) {
  switch (options.command) {
    case Command::requests: return client.Get("/requests");
    case Command::faults: return client.Get("/faults");
    case Command::fault: return client.Post("/faults", httplib::Params(options.fault.begin(), options.fault.end()));
    case Command::calm: return client.Post("/calm", "", "application/x-www-form-urlencoded");
    default: return client.Get("/tokens");
  }
}

}  // namespace

std::string askSandbox(const Options& options) {
  std::string address;
  std::string control;
  std::ifstream(options.folder / "address") >> address >> control;
  const std::string hint = "Start it with: palisade-sandbox --directory " + options.folder.string();
  if (control.empty()) throw std::runtime_error("No sandbox has run in " + options.folder.string() + ". " + hint);

  std::string secret;
  if (!(std::ifstream(options.folder / "control-secret") >> secret)) {
    throw std::runtime_error("The sandbox of " + options.folder.string() + " belongs to somebody else, or is older. " + hint);
  }

  httplib::Client client(control);
  client.set_bearer_token_auth(secret);
  client.set_ca_cert_path((options.folder / "ca.pem").string());
  const httplib::Result result = ask(client, options);
  if (!result) throw std::runtime_error("The sandbox at " + control + " does not answer. " + hint);
  if (result->status != 200) throw std::runtime_error("The sandbox refused: " + result->body);
  return result->body;
}

}  // namespace palisade::sandbox

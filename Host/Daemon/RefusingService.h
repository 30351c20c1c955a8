#pragma once

/// What the daemon does when others could have written its configuration: it answers every call with what is wrong, and does
/// nothing else. Nothing is opened, loaded or asked. As soon as it is mended the daemon ends, to be started anew by the next
/// call.
///
/// Threads: those of the bus. Ownership: owns what it is given. Errors: every call but `status` fails.

#include <functional>
#include <optional>
#include <string>

#include "Host/Bus/AccountsService.h"

namespace palisade {

class RefusingService final : public AccountsService {
 public:
  /// `trouble` says what is wrong now; none when that is mended, and then `end` is called.
  RefusingService(std::function<std::optional<std::string>()> trouble, std::function<void()> end)
      : _trouble(std::move(trouble)),
        _end(std::move(end)) {}

  // Whoever calls is told the same, so nobody is identified.
  std::optional<std::string> knownApplication(const BusCaller&) override { return "anybody"; }
  std::string identify(const BusCaller&) override { return "anybody"; }
  std::shared_ptr<const void> admitToken(const BusCaller&) override { return nullptr; }

  AccessOutcome requestAccess(const BusCaller&, const std::string&, const std::shared_ptr<const Dictionary>&,
                              PendingRequest&) override {
    refuse();
  }
  AccessOutcome authorize(const BusCaller&, const std::string&, const std::string&, PendingRequest&) override { refuse(); }
  std::string credential(const BusCaller&, const std::string&) override { refuse(); }
  Rows listAccounts(const BusCaller&, const std::string&) override { refuse(); }
  std::string addAccount(const BusCaller&, const std::string&, const std::string&,
                         const std::function<std::string()>&) override {
    refuse();
  }
  void removeAccount(const BusCaller&, const std::string&) override { refuse(); }
  Rows listGrants(const BusCaller&, const std::string&) override { refuse(); }
  void revoke(const BusCaller&, const std::string&, const std::string&) override { refuse(); }
  void revokeAll(const BusCaller&, const std::string&) override { refuse(); }
  Rows history(const BusCaller&, std::uint32_t, const std::optional<std::string>&) override { refuse(); }
  Rows listRevocations(const BusCaller&) override { refuse(); }
  Rows listClients(const BusCaller&) override { refuse(); }
  std::optional<Value> preference(const BusCaller&, const std::string&, const std::string&) override { refuse(); }
  void setPreference(const BusCaller&, const std::string&, const std::string&, const std::optional<Value>&) override {
    refuse();
  }
  bool mayPost(const BusCaller&) override { return false; }
  void close(std::uint64_t) override {}
  void callerLeft(const std::string&) override {}

  /// Says what is wrong, under "configuration_trouble".
  Dictionary status(const BusCaller& caller) override;

 private:
  [[noreturn]] void refuse();

  const std::function<std::optional<std::string>()> _trouble;
  const std::function<void()> _end;
};

}  // namespace palisade

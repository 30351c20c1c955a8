#include "Host/Accounts/AuthorizationRow.h"

#include <algorithm>
#include <bit>
#include <stdexcept>
#include <utility>
#include <vector>

#include "Host/Json/Json.h"

namespace palisade {
namespace {

// Options come over the bus, whose own limit on nesting is far below this.
const NlohmannJsonParser parser(NlohmannJsonParser::greatestDepth, NullCharacters::refused);

std::string writtenFaithfully(const Value& value, std::string_view what) {
  if (!survivesJson(value, NlohmannJsonParser::greatestDepth)) {
    throw std::invalid_argument(
        "the " + std::string(what) +
        " hold a value that cannot be kept: text that is not UTF-8 or holds U+0000, a number that is not "
        "finite, or too many levels");
  }
  return writeJson(value);
}

// What is not JSON reads as null.
std::shared_ptr<const Value> read(const std::string& text) {
  return std::make_shared<const Value>(parser.parse(text, JsonFragments::refused).value.value_or(Value()));
}

// FNV-1a, with the length before each text so that no two rows run into each other.
class Digest {
 public:
  void add(std::uint64_t number) {
    for (unsigned shift = 0; shift < 64; shift += 8) addByte(static_cast<std::uint8_t>(number >> shift));
  }
  void add(std::string_view text) {
    add(text.size());
    for (const char character : text) addByte(static_cast<std::uint8_t>(character));
  }
  void add(const std::optional<std::string>& text) {
    add(std::uint64_t{text.has_value()});
    if (text) add(std::string_view(*text));
  }
  std::int64_t value() const { return std::bit_cast<std::int64_t>(_state); }

 private:
  void addByte(std::uint8_t byte) { _state = (_state ^ byte) * 0x100000001b3U; }

  std::uint64_t _state = 0xcbf29ce484222325U;
};

}  // namespace

std::optional<std::string> storedOptions(const ClientAuthorization& record) {
  if (record.options() == nullptr) return std::nullopt;
  return writtenFaithfully(*record.options(), "options");
}

std::optional<std::string> storedPermissions(const ClientAuthorization& record) {
  if (record.grantedPermissions() == nullptr) return std::nullopt;
  std::vector<std::string> names(record.grantedPermissions()->begin(), record.grantedPermissions()->end());
  std::ranges::sort(names);
  return writtenFaithfully(Array(names.begin(), names.end()), "permissions");
}

std::shared_ptr<ClientAuthorization> recordInRow(const AuthorizationRow& row, std::shared_ptr<const Client> client) {
  auto record = std::make_shared<ClientAuthorization>(std::move(client));
  record->setIsGranted(row.granted);
  if (row.options) {
    const std::shared_ptr<const Value> options = read(*row.options);
    if (options->dictionary() == nullptr) return nullptr;
    record->setOptions({options, options->dictionary()});
  }
  if (row.permissions) {
    const std::shared_ptr<const Value> permissions = read(*row.permissions);
    if (permissions->array() == nullptr) return nullptr;
    PermissionSet names;
    forEachString(*permissions->array(), [&](const std::string& name) { names.insert(name); });
    record->setGrantedPermissions(std::make_shared<const PermissionSet>(std::move(names)));
  }
  return record;
}

std::int64_t digestOf(std::string_view accountTypeIdentifier, const AuthorizationRow& row) {
  Digest digest;
  digest.add(accountTypeIdentifier);
  digest.add(std::string_view(row.clientID));
  digest.add(row.bundleID);
  digest.add(std::string_view(row.appName));
  digest.add(std::uint64_t{row.granted});
  digest.add(std::uint64_t{row.answeredByNobody});
  digest.add(row.options);
  digest.add(row.permissions);
  digest.add(std::bit_cast<std::uint64_t>(row.updatedAt));
  return digest.value();
}

}  // namespace palisade

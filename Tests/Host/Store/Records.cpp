#include "Tests/Host/Store/Records.h"

#include <algorithm>
#include <ostream>

#include "Platform/Format.h"

namespace palisade {

ClientAuthorization makeRecord(const std::shared_ptr<const Client>& client, const RecordContent& content) {
  ClientAuthorization record(client);
  record.setIsGranted(content.isGranted);
  if (content.options) record.setOptions(std::make_shared<const Dictionary>(*content.options));
  if (content.permissions) {
    record.setGrantedPermissions(
        std::make_shared<const PermissionSet>(content.permissions->begin(), content.permissions->end()));
  }
  return record;
}

std::optional<RecordContent> contentOf(const std::shared_ptr<const ClientAuthorization>& record) {
  if (record == nullptr) return std::nullopt;
  RecordContent content{.isGranted = record->isGranted()};
  if (record->options() != nullptr) content.options = *record->options();
  if (record->grantedPermissions() != nullptr) {
    content.permissions.emplace(record->grantedPermissions()->begin(), record->grantedPermissions()->end());
    std::ranges::sort(*content.permissions);
  }
  return content;
}

void PrintTo(const RecordContent& content, std::ostream* stream) {
  *stream << (content.isGranted ? "granted" : "refused") << ", options "
          << (content.options ? compactJson(*content.options) : "none") << ", permissions ";
  if (content.permissions) {
    *stream << compactJson(Array(content.permissions->begin(), content.permissions->end()));
  } else {
    *stream << "none";
  }
}

RecordContent grantNumber(int number) {
  return {.isGranted = true,
          .options = Dictionary{{"FacebookAppIdKey", "12345678901234567890"}, {"number", number}},
          .permissions = std::vector<std::string>{"email", "number_" + std::to_string(number), "user_likes"}};
}

}  // namespace palisade

#include "Sandbox/RequestLog.h"

#include <utility>

namespace palisade::sandbox {

void RequestLog::add(LoggedRequest request) {
  const std::lock_guard lock(_mutex);
  if (_requests.size() == most) _requests.pop_front();
  _requests.push_back(std::move(request));
}

Value RequestLog::requests() const {
  const std::lock_guard lock(_mutex);
  Array requests;
  for (const LoggedRequest& request : _requests) {
    requests.push_back(Dictionary{{"method", request.method},
                                  {"path", request.path},
                                  {"fields", Array(request.fields.begin(), request.fields.end())},
                                  {"signed", request.isSigned},
                                  {"port", request.port},
                                  {"status", request.status},
                                  {"members", Array(request.members.begin(), request.members.end())}});
  }
  return requests;
}

}  // namespace palisade::sandbox

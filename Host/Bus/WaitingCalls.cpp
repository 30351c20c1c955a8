#include "Host/Bus/WaitingCalls.h"

#include <malloc.h>

#include <algorithm>
#include <utility>

#include "Host/Bus/AccountsService.h"
#include "Host/Bus/BusLoop.h"

namespace palisade {
namespace {

constexpr std::size_t crowd = 100;

}  // namespace

void WaitingCalls::run(const std::string& line, std::function<void()> call) {
  {
    const std::lock_guard lock(_mutex);
    Line& own = _lines[line];
    if (own.running == _atOnce) {
      if (own.waiting.size() >= _mostInLine) {
        throw BusFailure(BusFailureKind::tooManyRequests, "This application has " + std::to_string(_mostInLine) +
                                                              " unanswered calls of this method already. Wait for an answer.");
      }
      own.waiting.push_back(std::move(call));
      _mostWaiting = std::max(_mostWaiting, ++_waiting);
      return;
    }
    try {
      BusLoop::handOver();
    } catch (const BusFailure&) {
      if (own.running == 0) _lines.erase(line);
      throw;
    }
    ++own.running;
  }
  for (auto next = std::move(call); next != nullptr; next = nextOf(line)) next();
}

std::function<void()> WaitingCalls::nextOf(const std::string& line) {
  bool hasCrowdGone = false;
  {
    const std::lock_guard lock(_mutex);
    const auto own = _lines.find(line);
    if (!own->second.waiting.empty()) {
      auto next = std::move(own->second.waiting.front());
      own->second.waiting.pop_front();
      --_waiting;
      return next;
    }
    if (--own->second.running == 0) _lines.erase(own);
    hasCrowdGone = _lines.empty() && std::exchange(_mostWaiting, 0) >= crowd;
  }
  // What so many calls took lies scattered among what is still in use; the library keeps it unless it is asked.
  if (hasCrowdGone) malloc_trim(0);
  return nullptr;
}

}  // namespace palisade

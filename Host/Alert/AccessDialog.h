#pragma once

/// One question that a portal's backend was asked.
///
/// Threads: opened, waited for and destroyed by one thread; `takeDown` comes from any. Ownership: whoever opened it; its
/// destructor sees to it that a dialog that still stands is closed, for which it gives the backend half a second at most.
/// Errors: whatever happens to the backend is no reply.

#include <optional>

#include "Host/Alert/AccessReply.h"
#include "Host/Alert/Deadline.h"

namespace palisade {

class AccessDialog {
 public:
  virtual ~AccessDialog() = default;

  /// Waits for the reply, at most until `deadline`; called once. None, and the dialog is closed, when it was taken down or its
  /// time is over, when the backend leaves the bus or is replaced, and for an error and a reply of another form.
  virtual std::optional<AccessReply> waitForReply(Deadline deadline) = 0;

  /// Ends the wait at once, whatever the backend does.
  virtual void takeDown() = 0;
};

}  // namespace palisade

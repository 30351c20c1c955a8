#pragma once

/// An alert that answers itself and says so, for places where nobody can be asked: a build machine, a pipe.
///
/// Threads and ownership: see `SystemAlert`. Errors: none. Not for products: nobody has consented.

#include <iosfwd>

#include "Platform/SystemAlert.h"

namespace palisade {

class AnnouncedAnswer final : public SystemAlert {
 public:
  /// Shows alerts on `output` and answers each with the default button or, unless `allows`, with the other one.
  AnnouncedAnswer(std::ostream& output, bool allows) : _output(output), _allows(allows) {}

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

 private:
  std::ostream& _output;
  bool _allows;
};

}  // namespace palisade

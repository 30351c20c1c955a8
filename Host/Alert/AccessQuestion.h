#pragma once

/// A question in the parts of which a portal's access dialog consists.
///
/// Threads: a pure function. Errors: none. Backends differ in what they make of special characters: GTK's shows them as they
/// are but reads the title as a printf format, others may take text that looks like markup for it. No escape suits them all, so
/// characters that mean something to any of them are replaced by ones that look alike and mean nothing.

#include <string>

#include "Host/Alert/AlertQuestion.h"

namespace palisade {

struct AccessQuestion {
  std::string title;
  /// The sentence that asks.
  std::string subtitle;
  /// Who asks, and for what account, one a line; empty when that is not known.
  std::string body;
  std::string denyLabel;
  std::string grantLabel;
};

AccessQuestion accessQuestion(const AlertQuestion& question);

}  // namespace palisade

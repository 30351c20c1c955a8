#pragma once

/// What the desktop helper says when the user has decided: one frame of a fixed size.
///
/// The frame repeats the random number of the question, so that it answers that question and no other, and ends with a check
/// over everything before it. Threads: pure functions, but for `freshNonce`, which asks the kernel. Errors: bytes that are not
/// exactly one such frame are no answer.

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace palisade {

/// Names one question. Only the helper that was asked it knows it.
using AlertNonce = std::array<std::uint8_t, 32>;

/// From the kernel's random numbers. Throws `std::system_error` when there are none.
AlertNonce freshNonce();

/// As lower-case hexadecimal digits, and back; none for anything else.
std::string hexadecimal(const AlertNonce& nonce);
std::optional<AlertNonce> nonceFromHexadecimal(std::string_view text);

/// What became of the question, as it stands in the frame.
enum class AlertWord : std::uint32_t {
  allowed = 0,
  refused = 1,
  closed = 2  ///< Escape, or the window was closed: nobody's answer
};

inline constexpr std::size_t alertAnswerSize = 4 + 32 + 4 + 8;

std::string alertAnswerFrame(const AlertNonce& nonce, AlertWord word);

/// The word of the frame that `bytes` are, if they answer the question with this nonce.
std::optional<AlertWord> wordOfAlertAnswer(std::string_view bytes, const AlertNonce& nonce);

}  // namespace palisade

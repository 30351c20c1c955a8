#pragma once

/// For tests that take root: they give files away, become other users, mount disks, or have a network of their own.
///
///     TEST(AFileOfAnotherUser, IsRefused) {
///       if (ranWithItsOwnRoot()) return;
///       ...
///
/// Threads: the test's own. Errors: what fails in there fails the test; where no such namespace can be made, the test is
/// skipped with the reason.

namespace palisade {

/// False for root, who goes on with the test. For every other user the test has then been run, in a process of its own: in a
/// user namespace, in which this user is root and the users of /etc/subuid are the others, and a mount namespace.
bool ranWithItsOwnRoot();

}  // namespace palisade

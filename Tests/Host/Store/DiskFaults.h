#pragma once

/// Makes the disk fail: full, broken, or gone with the power, at the n-th call that writes.
///
/// The program that is linked with DiskFaults.cpp answers `write`, `pwrite64`, `ftruncate64`, `fsync` and `fdatasync` itself,
/// for its shared libraries too. Calls on files below the watched folder are counted; every other call goes through. Threads:
/// safe from every thread. Orders are given while no store is at work.

#include <cstddef>
#include <filesystem>

namespace palisade::disk {

enum class Fault {
  failsOnce,     ///< the n-th call fails
  failsFromNow,  ///< the n-th call and every later one fail
  kill           ///< the process is killed instead of doing the n-th call
};

/// Watches the folder: calls are counted from here on.
void watch(const std::filesystem::path& folder);

/// Gives the order, counting from 1 from here on. `errorNumber` is what a failing call sets.
void order(Fault fault, std::size_t call, int errorNumber = 0);

/// Takes the order back; answers whether it was carried out.
bool withdraw();

/// While it is on, there is a copy beside each file of what a power cut leaves of it at least.
void keepSyncedCopies(bool isOn);

/// What a power cut leaves at least of the folder's files: what was synced. Names of files count as synced.
void cutPower(const std::filesystem::path& folder);

}  // namespace palisade::disk

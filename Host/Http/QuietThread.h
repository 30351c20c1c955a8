#pragma once

/// Starts a thread on which no signal is delivered: signals belong to the main thread, and a broken connection is an error of
/// one transfer, never a SIGPIPE. Errors: throws `std::system_error` when no thread can be had.

#include <pthread.h>

#include <csignal>
#include <exception>
#include <thread>
#include <utility>

namespace palisade {

template <typename Work>
std::thread startQuietThread(const char* name, Work work) {
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  pthread_sigmask(SIG_SETMASK, &all, &before);
  std::thread thread;
  std::exception_ptr failure;
  try {
    thread = std::thread(std::move(work));
  } catch (...) {
    failure = std::current_exception();
  }
  pthread_sigmask(SIG_SETMASK, &before, nullptr);
  if (failure) std::rethrow_exception(failure);
  pthread_setname_np(thread.native_handle(), name);
  return thread;
}

}  // namespace palisade

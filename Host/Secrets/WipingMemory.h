#pragma once

/// The C allocator's functions, except that memory is wiped before it is given back: for libraries that let their caller choose
/// the functions. Token-bearing buffers of a TLS or HTTP library are freed as they are otherwise.
///
/// libcurl, in place of `curl_global_init`:
///     curl_global_init_mem(CURL_GLOBAL_DEFAULT, wipingMalloc, wipingFree, wipingRealloc, wipingStrdup, wipingCalloc);
/// OpenSSL, before any other call to it:
///     CRYPTO_set_mem_functions(wipingMallocAt, wipingReallocAt, wipingFreeAt);
///
/// Threads: safe from every thread. Ownership: as with the C functions; memory of one kind may be freed by the other, unwiped.
/// Errors: null when there is no memory; a failed `wipingRealloc` leaves the old block as it was.

#include <cstddef>

namespace palisade {

extern "C" {
void* wipingMalloc(std::size_t size);
void* wipingCalloc(std::size_t count, std::size_t size);
void* wipingRealloc(void* memory, std::size_t size);
char* wipingStrdup(const char* text);
void wipingFree(void* memory);

/// The same with the place of the call, which is not looked at.
void* wipingMallocAt(std::size_t size, const char* file, int line);
void* wipingReallocAt(void* memory, std::size_t size, const char* file, int line);
void wipingFreeAt(void* memory, const char* file, int line);
}

}  // namespace palisade

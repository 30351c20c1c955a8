// A module that says, when it is loaded, which environment variables the process has at that moment.

#include <unistd.h>

#include <cstdio>

[[gnu::constructor]] static void speak() {
  for (char** entry = environ; *entry != nullptr; ++entry) dprintf(STDERR_FILENO, "environment: %s\n", *entry);
}

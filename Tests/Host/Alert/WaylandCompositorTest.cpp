// What a compositor says that it offers, and compositors that say nothing or nonsense. A real one is asked in Tests/Desktop.

#include "Host/Alert/WaylandCompositor.h"

#include <gmock/gmock.h>
#include <sys/socket.h>

#include <cstring>

#include "Host/Files/FileDescriptor.h"

namespace palisade {
namespace {

constexpr std::uint32_t registryObject = 2;
constexpr std::uint32_t callbackObject = 3;

std::string wordBytes(std::uint32_t number) {
  std::string bytes(sizeof number, '\0');
  std::memcpy(bytes.data(), &number, sizeof number);
  return bytes;
}

std::string event(std::uint32_t object, std::uint32_t number, const std::string& arguments) {
  return wordBytes(object) + wordBytes(static_cast<std::uint32_t>(8 + arguments.size()) << 16 | number) + arguments;
}

std::string global(const std::string& interface) {
  std::string padded = interface + std::string(4 - interface.size() % 4, '\0');
  return event(registryObject, 0,
               wordBytes(7) + wordBytes(static_cast<std::uint32_t>(interface.size() + 1)) + padded + wordBytes(1));
}

const std::string globalsAnnounced = event(callbackObject, 0, wordBytes(42));

enum class Then { waits, hangsUp };

// What comes of a compositor that says these bytes.
bool isOffered(const std::string& bytes, Then then = Then::waits) {
  int ends[2];
  EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
  const FileDescriptor ours(ends[0]);
  FileDescriptor theirs(ends[1]);
  EXPECT_EQ(send(theirs.number(), bytes.data(), bytes.size(), MSG_NOSIGNAL), static_cast<ssize_t>(bytes.size()));
  if (then == Then::hangsUp) theirs = FileDescriptor(-1);
  return offersGlobal(ours, "zwlr_layer_shell_v1");
}

TEST(ACompositor, OffersWhatItAnnounces) {
  const std::string layers = global("zwlr_layer_shell_v1");
  EXPECT_TRUE(isOffered(layers));
  EXPECT_TRUE(isOffered(global("wl_compositor") + global("wl_shm") + layers + globalsAnnounced));
  EXPECT_FALSE(isOffered(global("wl_compositor") + globalsAnnounced));
  EXPECT_FALSE(isOffered(global("wl_compositor") + globalsAnnounced + layers)) << "all was said before";
  EXPECT_FALSE(isOffered(global("zwlr_layer_shell_v12") + global("zwlr_layer_shell_v") + globalsAnnounced));
}

TEST(ACompositor, OffersNothingWhenItTalksNonsenseOrNotAtAll) {
  const std::string layers = global("zwlr_layer_shell_v1");
  EXPECT_FALSE(isOffered("")) << "silence";
  for (const std::string& nonsense : {std::string(), std::string("HTTP/1.1 400 Bad Request\r\n\r\n"), std::string(4096, '\0'),
                                      std::string(4096, '\xFF'), layers.substr(0, layers.size() - 1), event(1, 0, "") + layers,
                                      wordBytes(registryObject) + wordBytes(0) + layers, event(registryObject, 1, wordBytes(7)),
                                      event(registryObject, 0, ""), event(registryObject, 0, wordBytes(7) + wordBytes(0)),
                                      event(registryObject, 0, wordBytes(7) + wordBytes(UINT32_MAX) + "zwlr_layer_shell_v1")}) {
    EXPECT_FALSE(isOffered(nonsense, Then::hangsUp));
  }
}

}  // namespace
}  // namespace palisade

#include "Sandbox/FaultyAnswer.h"

#include <zlib.h>

#include <algorithm>
#include <cstdio>
#include <stdexcept>
#include <thread>
#include <vector>

namespace palisade::sandbox {
namespace {

constexpr std::size_t hugeSize = 100'000'000;
constexpr std::size_t bombSize = 10'000'000;
constexpr std::size_t blockSize = 16'384;
constexpr std::size_t greatDepth = 30'000;

std::string head(int status, const std::string& fields) {
  return "HTTP/1.1 " + std::to_string(status) + " Sandbox\r\n" + fields + "\r\n";
}

std::string json(int status, const std::string& body, const std::string& fields = {}) {
  return head(status, fields + "Content-Type: application/json\r\nContent-Length: " + std::to_string(body.size()) + "\r\n") +
         body;
}

std::string chunk(const std::string& bytes) {
  char size[20];
  std::snprintf(size, sizeof size, "%zx\r\n", bytes.size());
  return size + bytes + "\r\n";
}

// A string of blanks, as a JSON text, in gzip's format.
std::string bomb() {
  z_stream stream = {};
  constexpr int gzipFormat = 15 + 16;
  constexpr int memoryLevel = 9;
  if (deflateInit2(&stream, Z_BEST_COMPRESSION, Z_DEFLATED, gzipFormat, memoryLevel, Z_DEFAULT_STRATEGY) != Z_OK) {
    throw std::runtime_error("Cannot compress.");
  }
  std::string compressed;
  std::string block(blockSize, ' ');
  block.front() = '"';
  for (std::size_t written = 0; written < bombSize; written += blockSize) {
    std::vector<unsigned char> output(2 * blockSize);
    stream.next_in = reinterpret_cast<unsigned char*>(block.data());
    stream.avail_in = static_cast<unsigned>(block.size());
    stream.next_out = output.data();
    stream.avail_out = static_cast<unsigned>(output.size());
    deflate(&stream, written + blockSize < bombSize ? Z_NO_FLUSH : Z_FINISH);
    compressed.append(output.begin(), output.begin() + static_cast<std::ptrdiff_t>(output.size() - stream.avail_out));
    block.front() = ' ';
  }
  deflateEnd(&stream);
  return compressed;
}

void writeSlowly(const Fault& fault, const std::string& answer, RawConnection& connection) {
  for (const char byte : answer) {
    if (!connection.write({&byte, 1})) return;
    std::this_thread::sleep_for(fault.interval);
  }
}

void writeHugeBody(RawConnection& connection) {
  connection.write(head(200, "Content-Type: application/json\r\nTransfer-Encoding: chunked\r\n"));
  const std::string block = chunk(std::string(blockSize, ' '));
  for (std::size_t written = 0; written < hugeSize && connection.write(block); written += blockSize) {
  }
}

void writeHugeHead(RawConnection& connection) {
  connection.write("HTTP/1.1 200 Sandbox\r\n");
  const std::string field = "X-Sandbox: " + std::string(1000, 'x') + "\r\n";
  for (std::size_t written = 0; written < hugeSize && connection.write(field); written += field.size()) {
  }
}

}  // namespace

void answerWithFault(const Fault& fault, const std::string& answer, RawConnection& connection) {
  static constexpr const char* types = R"({"access_token":7,"permissions":"email","error_msg":["no",{"token":null}]})";
  static constexpr const char* duplicates =
      R"({"access_token":"first","permissions":["email"],"access_token":"second","permissions":["publish_stream"]})";
  // Escape sequences, a bell, a line of its own, marks that turn the text around, and code points that are no characters.
  static constexpr const char* message =
      "{\"error\":\"fault\",\"error_msg\":\"Red: \\u001b[31m\\u001b]0;title\\u0007\\u009b2J\\r\\nAccess is granted."
      "\\u202Eturned\\u2066\\u200B\\u0000 \xEF\xB7\x90\xEF\xB7\xAF\xEF\xBF\xBE\xEF\xBF\xBF\xF4\x8F\xBF\xBF end\"}";
  static constexpr const char* page = "<!DOCTYPE html><title>Sign in</title><p>Please sign in to use this network.";
  switch (fault.kind) {
    case FaultKind::silent: connection.waitForClient(); break;
    case FaultKind::slow: writeSlowly(fault, answer, connection); break;
    case FaultKind::stall:
      connection.write(answer.substr(0, fault.bytes));
      connection.waitForClient();
      break;
    case FaultKind::close: connection.write(answer.substr(0, fault.bytes)); break;
    case FaultKind::reset:
      connection.write(answer.substr(0, fault.bytes));
      connection.reset();
      break;
    case FaultKind::twice:
      connection.write(answer.substr(0, fault.bytes));
      connection.write(answer.substr(std::min(fault.bytes, answer.size())) + answer);
      connection.waitForClient();
      break;
    case FaultKind::huge: writeHugeBody(connection); break;
    case FaultKind::bomb: connection.write(json(200, bomb(), "Content-Encoding: gzip\r\n")); break;
    case FaultKind::transferBomb:
      connection.write(head(200, "Content-Type: application/json\r\nTransfer-Encoding: gzip, chunked\r\n") + chunk(bomb()) +
                       chunk({}));
      break;
    case FaultKind::head: writeHugeHead(connection); break;
    case FaultKind::deep: connection.write(json(200, std::string(greatDepth, '[') + std::string(greatDepth, ']'))); break;
    case FaultKind::types: connection.write(json(200, types)); break;
    case FaultKind::duplicate: connection.write(json(200, duplicates)); break;
    case FaultKind::text: connection.write(json(200, "\"\xC3\x28\"")); break;
    case FaultKind::message: connection.write(json(400, message)); break;
    case FaultKind::page:
      connection.write(
          head(200, "Content-Type: text/html\r\nContent-Length: " + std::to_string(std::string(page).size()) + "\r\n") + page);
      break;
    case FaultKind::garbage: connection.write("220 sandbox ESMTP\r\n"); break;
    case FaultKind::redirect:
    case FaultKind::unavailable:
    case FaultKind::status: connection.write(answer); break;
  }
}

}  // namespace palisade::sandbox

#include "Host/Http/HttpClient.h"

#include <utility>

#include "Host/Http/TransferThread.h"

namespace palisade {

HttpTransfer::HttpTransfer(std::weak_ptr<TransferThread> thread, std::uint64_t number)
    : _thread(std::move(thread)),
      _number(number) {}

HttpTransfer::~HttpTransfer() {
  if (const auto thread = _thread.lock()) thread->cancel(_number);
}

HttpClient::HttpClient(HttpClientOptions options) : _thread(std::make_shared<TransferThread>(std::move(options))) {}

HttpClient::~HttpClient() { _thread->end(); }

std::unique_ptr<HttpTransfer> HttpClient::send(HttpRequest request, HttpHandler handler) {
  return std::make_unique<HttpTransfer>(_thread, _thread->start(std::move(request), std::move(handler)));
}

}  // namespace palisade

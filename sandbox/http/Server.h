#pragma once

#include <cstdint>
#include <functional>
#include <memory>

#include "sandbox/core/Outcome.h"
#include "sandbox/http/Certificate.h"
#include "sandbox/http/Message.h"

namespace sandbox {

// An HTTPS server on 127.0.0.1: HTTP/1.1 with keep-alive over TLS 1.2 or 1.3 with session tickets.
//
// Threading: `handler` is called on the server's threads, several at a time. Ownership: the
// destructor stops the server and waits for its threads. Errors: what goes wrong with one
// connection ends that connection only.
class Server final {
 public:
  using Handler = std::function<Reply(Request)>;

  // Listens, port 0 meaning any free one, but answers nobody before `start`.
  static Outcome<std::unique_ptr<Server>> listen(const CertificateFiles& certificate,
                                                 std::uint16_t port);
  ~Server();

  std::uint16_t port() const;
  void start(Handler handler, unsigned threads);
  void stop();

 private:
  class Core;
  explicit Server(std::shared_ptr<Core> core);

  const std::shared_ptr<Core> core_;
};

}  // namespace sandbox

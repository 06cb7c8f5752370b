#include "sandbox/http/Server.h"

#include <netinet/tcp.h>
#include <openssl/ssl.h>

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/strand.hpp>
#include <thread>
#include <utility>
#include <vector>

#include "sandbox/http/Connection.h"

namespace sandbox {

namespace asio = boost::asio;
using boost::system::error_code;

namespace {

constexpr int kFastOpenQueue = 64;

int chooseHttp(SSL*, const unsigned char** chosen, unsigned char* size,
               const unsigned char* offered, unsigned offeredSize, void*) {
  static constexpr unsigned char kProtocols[] = {8, 'h', 't', 't', 'p', '/', '1', '.', '1'};
  unsigned char* match = nullptr;
  const int found =
      SSL_select_next_proto(&match, size, kProtocols, sizeof kProtocols, offered, offeredSize);
  *chosen = match;
  return found == OPENSSL_NPN_NEGOTIATED ? SSL_TLSEXT_ERR_OK : SSL_TLSEXT_ERR_NOACK;
}

error_code configure(asio::ssl::context& context, const CertificateFiles& files) {
  error_code error;
  context.use_certificate_chain_file(files.certificate, error);
  if (!error) context.use_private_key_file(files.key, asio::ssl::context::pem, error);
  static constexpr unsigned char kSessionContext[] = "sandbox";
  SSL_CTX_set_session_id_context(context.native_handle(), kSessionContext,
                                 sizeof kSessionContext - 1);
  SSL_CTX_set_min_proto_version(context.native_handle(), TLS1_2_VERSION);
  SSL_CTX_set_alpn_select_cb(context.native_handle(), &chooseHttp, nullptr);
  return error;
}

}  // namespace

// What the operations under way share.
class Server::Core final : public std::enable_shared_from_this<Core> {
 public:
  Core() : acceptor_(io_), context_(asio::ssl::context::tls_server) {}

  error_code open(const CertificateFiles& certificate, std::uint16_t port) {
    if (const auto error = configure(context_, certificate)) return error;
    error_code error;
    const asio::ip::tcp::endpoint endpoint(asio::ip::address_v4::loopback(), port);
    acceptor_.open(endpoint.protocol(), error);
    if (!error) acceptor_.set_option(asio::socket_base::reuse_address(true), error);
    if (!error) acceptor_.bind(endpoint, error);
    // Not every kernel allows it; connections are merely slower then.
    ::setsockopt(acceptor_.native_handle(), IPPROTO_TCP, TCP_FASTOPEN, &kFastOpenQueue,
                 sizeof kFastOpenQueue);
    if (!error) acceptor_.listen(asio::socket_base::max_listen_connections, error);
    return error;
  }

  std::uint16_t port() const {
    error_code ignored;
    return acceptor_.local_endpoint(ignored).port();
  }

  void start(Handler handler, unsigned threads) {
    handler_ = std::move(handler);
    _accept();
    for (unsigned count = 0; count < threads; ++count) threads_.emplace_back([this] { io_.run(); });
  }

  void stop() {
    io_.stop();
    for (auto& thread : threads_) thread.join();
    threads_.clear();
  }

 private:
  void _accept() {
    acceptor_.async_accept(
        asio::make_strand(io_), [this](error_code error, asio::ip::tcp::socket socket) {
          if (error == asio::error::operation_aborted) return;
          if (!error)
            std::make_shared<Connection>(std::move(socket), context_, handler_, ++connections_)
                ->start();
          _accept();
        });
  }

  asio::io_context io_;
  asio::ip::tcp::acceptor acceptor_;
  asio::ssl::context context_;
  Handler handler_;
  std::uint64_t connections_ = 0;  // of the one accept operation under way
  std::vector<std::thread> threads_;
};

Outcome<std::unique_ptr<Server>> Server::listen(const CertificateFiles& certificate,
                                                std::uint16_t port) {
  auto core = std::make_shared<Core>();
  if (const auto error = core->open(certificate, port)) {
    return Failure{"cannot listen on 127.0.0.1:" + std::to_string(port) + ": " + error.message()};
  }
  return std::unique_ptr<Server>(new Server(std::move(core)));
}

Server::Server(std::shared_ptr<Core> core) : core_(std::move(core)) {}

Server::~Server() { stop(); }

std::uint16_t Server::port() const { return core_->port(); }

void Server::start(Handler handler, unsigned threads) { core_->start(std::move(handler), threads); }

void Server::stop() { core_->stop(); }

}  // namespace sandbox

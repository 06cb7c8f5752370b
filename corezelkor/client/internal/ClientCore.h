#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "corezelkor/ZLKPromise.h"
#include "corezelkor/client/ClientError.h"
#include "corezelkor/client/ClientOptions.h"
#include "corezelkor/client/internal/BagListener.h"
#include "corezelkor/client/internal/ClientLoop.h"
#include "corezelkor/client/internal/Door.h"
#include "corezelkor/client/internal/ServiceOpener.h"

namespace zelkor {

// What the classes of the client library share: one thread, the connection to the daemon's objects
// and the one to its endpoint.
//
// Every new main connection is configured before anything else is sent on it; the address of the
// endpoint comes from that answer and is forgotten with the connection.
//
// Threading: call() and the options on any thread; the rest belongs to the loop.
// Ownership: its end completes all calls as Cancelled.
class ClientCore {
 public:
  enum class Place { Main, Endpoint };
  struct Target {
    Place place = Place::Main;
    std::string_view interface;
    std::string_view member;
  };
  using Encode = std::function<void(MessageWriter&)>;

  explicit ClientCore(ClientOptions options);
  ~ClientCore();

  const ClientOptions& options() const { return options_; }

  void call(const Target& target, Encode encode, DoorCall::Completion completion);

  // The same with a future; `decode` takes the result from the reply.
  template <typename Result>
  ZLKFuture<Result> call(const Target& target, Encode encode,
                         std::function<void(MessageReader&, Result&)> decode, Result result = {});

 private:
  using AddressReceiver = std::function<void(const std::string&, const std::optional<Error>&)>;

  LoopWait _turn();
  ClientTime _deadline() const;
  void _didOpen(BusConnection& connection);
  void _configure() ZK_REQUIRES(loop_);
  void _didConfigure(std::string address, std::optional<Error> error);
  void _tellAddress(const std::optional<Error>& error) ZK_REQUIRES(loop_);
  void _withEndpointAddress(AddressReceiver receiver) ZK_REQUIRES(loop_);
  void _openEndpoint(const Door::Opened& opened);

  const ClientOptions options_;
  ClientLoop loop_;

  // The loop's.
  ServiceOpener opener_ ZK_ON(loop_);
  BagListener bagListener_ ZK_ON(loop_);
  Door main_ ZK_ON(loop_);
  Door endpoint_ ZK_ON(loop_);
  bool configuring_ ZK_ON(loop_) = false;
  std::string endpointAddress_ ZK_ON(loop_);  // empty: not known
  std::vector<AddressReceiver> addressReceivers_ ZK_ON(loop_);
};

template <typename Result>
ZLKFuture<Result> ClientCore::call(const Target& target, Encode encode,
                                   std::function<void(MessageReader&, Result&)> decode,
                                   Result result) {
  const ZLKPromise<Result> promise;
  call(target, std::move(encode),
       [promise, decode = std::move(decode), result = std::move(result)](
           MessageReader* reader, std::optional<Error> error) {
         auto outcome = result;
         if (reader) {
           decode(*reader, outcome);
           if (!reader->ok()) {
             outcome = result;
             error = clientError(ClientErrorCode::BadReply, "the reply has another form");
           }
         }
         if (error) outcome.error = std::move(error);
         promise.fulfill(std::move(outcome));
       });
  return promise.future();
}

}  // namespace zelkor

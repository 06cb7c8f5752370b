#pragma once

#include <sys/types.h>

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "base/Data.h"
#include "base/Error.h"
#include "base/Subscription.h"

// Interprocess connections: messages of typed values between the daemon and its clients. Everything
// here is about any client and any interface; what the daemon's own interfaces mean is in
// zelkord/core.
namespace zelkord::ipc {

struct Value;
// An open file, closed with its last copy.
class FileHandle {
 public:
  FileHandle() = default;
  explicit FileHandle(int descriptor);  // takes it over
  int descriptor() const { return shared_ ? *shared_ : -1; }

 private:
  std::shared_ptr<const int> shared_;
};

using Dictionary = std::map<std::string, Value, std::less<>>;          // a{sv}
using StringMap = std::map<std::string, std::string, std::less<>>;     // a{ss}
using StringPairs = std::vector<std::pair<std::string, std::string>>;  // a(ss)
using Strings = std::vector<std::string>;                              // as
using DataMap = std::vector<std::pair<std::string, Data>>;             // a{say}
using IntegerMap = std::map<std::string, std::int64_t, std::less<>>;   // a{sx}
using FileHandles = std::vector<FileHandle>;                           // ah

// A received value whose type no interface here uses; only its signature is kept.
struct Unsupported {
  std::string signature;
};

// One value. The alternative fixes its D-Bus type: b, i, u, x, t, d, s, ay, as, a(ss), a{ss},
// a{sx}, a{say}, a{sv}, aa{ss}, aa{sv}, h, ah.
struct Value {
  using Variant = std::variant<bool, std::int32_t, std::uint32_t, std::int64_t, std::uint64_t,
                               double, std::string, Data, Strings, StringPairs, StringMap,
                               IntegerMap, DataMap, Dictionary, std::vector<StringMap>,
                               std::vector<Dictionary>, FileHandle, FileHandles, Unsupported>;
  Variant variant;

  Value() = default;
  template <typename T>
  requires std::is_constructible_v<Variant, T> Value(T&& value)
      : variant(std::forward<T>(value)) {}                 // NOLINT(google-explicit-constructor)
  Value(const char* text) : variant(std::string(text)) {}  // NOLINT(google-explicit-constructor)

  template <typename T>
  const T* get() const {
    return std::get_if<T>(&variant);
  }
};
using Values = std::vector<Value>;

// The D-Bus signature of a value, and of values in a row. Of an unsupported value it is the one it
// came with.
std::string signatureOf(const Value& value);
std::string signatureOf(const Values& values);

// What an incoming value may be at most. Beyond it the call is answered with LimitsExceeded and not
// delivered.
struct Limits {
  std::size_t stringBytes = 65'536;  // every string, keys included
  std::size_t byteArrayBytes = 1u << 20;
};

// Arguments in a row, written as "s kind, a{sv} request": D-Bus types with their names. The names
// are only for introspection; without any the text is a signature.
struct Arguments {
  Arguments(const char* text = "");  // NOLINT(google-explicit-constructor)

  std::string signature;
  std::vector<std::string> names;
};

struct Method {
  std::string name;
  Arguments in;
  Arguments out;  // of the reply
  // Delivered like any other. A caller that asks for a reply all the same gets an empty one once
  // the handler has let go of the call, or what it failed with.
  bool noReply = false;
};

struct Interface {
  std::string name;
  std::vector<Method> methods;
  std::vector<std::pair<std::string, Arguments>> signals;  // only for introspection
};

// The way back to one caller. Answered at most once, from any thread; never answered is a legal
// outcome. The last copy gone without an answer: the caller is simply not answered.
class Reply {
 public:
  virtual ~Reply() = default;
  virtual void send(Values values) = 0;
  virtual void fail(std::string_view errorName, std::string_view text) = 0;
};
inline constexpr std::string_view kInvalidArgs = "org.freedesktop.DBus.Error.InvalidArgs";
inline constexpr std::string_view kLimitsExceeded = "org.freedesktop.DBus.Error.LimitsExceeded";

struct Call {
  std::string interface;
  std::string member;
  Values arguments;  // agree with the method's signature
  std::shared_ptr<Reply> reply;

  template <typename T>
  const T& argument(std::size_t index) const {
    return *arguments.at(index).get<T>();
  }
};

struct Peer {
  pid_t pid = 0;
  uid_t uid = 0;
};

class Connection;

// Gets a connection's calls, one at a time, on that connection's own serial queue.
class CallHandler {
 public:
  virtual ~CallHandler() = default;
  virtual void handle(Call call) = 0;
  // The client sent a message that the transport deals with itself: what every D-Bus peer is asked,
  // a call that is refused, a signal. On any thread; brief.
  virtual void messageArrived() {}
};

// One client's connection, on whichever door. It stays usable (and mute) after its end.
//
// Threading: any thread.
// Ownership: the transport holds it until its end; the handler and the invalidation handler are
// released after it.
class Connection {
 public:
  virtual ~Connection() = default;
  virtual Peer peer() const = 0;
  virtual void setHandler(std::shared_ptr<CallHandler> handler) = 0;
  // Runs once, on the connection's queue, when the client went away or `invalidate` was called.
  virtual void setInvalidationHandler(std::function<void()> handler) = 0;
  // Ends the connection from our side; calls under way are never answered. A bus client gets the
  // signal "Invalidated" of the connection interface, a private socket is closed.
  virtual void invalidate() = 0;
  // Calls a method of the client's own object and wants no answer. `signature` types the values.
  virtual void callClient(std::string_view path, std::string_view interface,
                          std::string_view member, std::string_view signature, Values values,
                          std::function<void(const Error&)> failure) = 0;
};

// Decides about connections of one listener. Every operation runs on the listener's own queue.
class ListenerDelegate {
 public:
  virtual ~ListenerDelegate() = default;
  // A socket was accepted (private doors only). `decide` is called once, now or later, from any
  // thread: with a subscription the connection goes on and holds it until its end; with none it is
  // closed without a byte.
  virtual void admit(const Peer& peer, std::function<void(std::optional<Subscription>)> decide) = 0;
  // A connection began (private door: authenticated; bus: first call of the connection interface).
  // The delegate sets its handlers before it returns.
  virtual void connectionBegan(const std::shared_ptr<Connection>& connection) = 0;
};

struct ListenerConfiguration {
  std::vector<Interface> interfaces;
  std::string connectionInterface;  // on the bus, only calls of this one begin a connection
  // Gets bus callers' calls of the other interfaces while they have no connection. May be null.
  std::shared_ptr<CallHandler> sharedHandler;
  Limits limits;
  // The delegate's admission says how many connections there are; those count in no budget then.
  bool delegateBoundsConnections = false;
};

// An anonymous listener: a private socket with an unguessable name. Closed when destroyed, its
// connections too.
class AnonymousListener {
 public:
  virtual ~AnonymousListener() = default;
  virtual const std::string& address() const = 0;  // D-Bus address
};

// How the transport is doing.
struct Statistics {
  std::size_t connections = 0;
  std::uint64_t calls = 0;
  std::uint64_t refused = 0;    // calls answered with an error by the transport itself
  std::size_t queuedBytes = 0;  // waiting for clients to read
  std::size_t heldBytes = 0;    // these, unfinished messages, and calls that are not answered yet
};

// The doors of this process. All objects are at /com/quenta/zelkord.
class Interprocess {
 public:
  virtual ~Interprocess() = default;
  // Serves `name` on the session bus and on the private socket. Owns the name when it returns
  // without error.
  virtual std::optional<Error> listen(const std::string& name, ListenerConfiguration configuration,
                                      std::shared_ptr<ListenerDelegate> delegate) = 0;
  virtual std::unique_ptr<AnonymousListener> makeAnonymousListener(
      ListenerConfiguration configuration, std::shared_ptr<ListenerDelegate> delegate) = 0;
  // The last path component of the process's executable; an error when it cannot be read.
  virtual std::variant<std::string, Error> executableName(pid_t pid) const = 0;
  virtual Statistics statistics() const = 0;
};

}  // namespace zelkord::ipc

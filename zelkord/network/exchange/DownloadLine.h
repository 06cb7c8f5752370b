#pragma once

#include <cstddef>
#include <cstdint>
#include <list>
#include <map>
#include <string>
#include <unordered_map>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

// The order in which downloads begin: few at a time from one host, more from one that answers many
// on one connection, and not too many in all; the others wait. Those of one host begin in the order
// in which they came, and the hosts take turns. Each host has a few places of its own beyond the
// total, so that hosts that never answer hold up no other one.
//
// What nobody waits for any more (`abandon`) begins only when nothing else may; of that the newest
// ones stay, few of a host and in all, and none of a host that does not answer.
//
// Threading: none of its own. Ownership: holds identifiers only; how many may wait is up to the
// caller.
class DownloadLine final {
 public:
  using Id = std::uint64_t;
  enum class Connections { OneEach, Shared };

  static constexpr std::size_t kMostUnderWay = 48;
  static constexpr std::size_t kMostWithOwnPlaces = 96;
  static constexpr std::size_t kOwnPlacesOfAHost = 4;
  static constexpr std::size_t kMostOfOneHost = 16;
  static constexpr std::size_t kMostOnSharedConnection = 32;
  static constexpr std::size_t kMostAbandoned = 512;
  static constexpr std::size_t kMostAbandonedOfOneHost = 64;

  // Requires an identifier that is not in the line.
  void add(const std::string& host, Id id);
  // One that had begun has ended; `connections` is how the host answered it.
  void ended(const std::string& host, Connections connections);
  // Nobody waits for it any more; gives those that lose their place for it, perhaps itself. Without
  // effect for one that has begun.
  std::vector<Id> abandon(Id id);
  // Of a host that does not answer: gives what nobody waits for, which loses its place.
  std::vector<Id> dropAbandoned(const std::string& host);
  // Somebody waits for it again, behind those of its host that wait. Without effect for one that
  // has begun.
  void want(Id id);
  bool isWaiting(Id id) const { return places_.contains(id); }
  // Those that begin now; from here on they are under way.
  std::vector<Id> takeDue();

 private:
  struct Host;
  using Hosts = std::map<std::string, Host>;
  struct Waiting {
    Id id;
    Hosts::iterator host;
    bool isAbandoned = false;
  };
  using Line = std::list<Waiting>;
  struct Host {
    std::size_t underWay = 0;
    std::size_t most = kMostOfOneHost;  // remembered as long as something waits or is under way
    std::size_t abandoned = 0;
    Line wanted;
  };

  bool _mayBegin(const Host& host) const;
  Hosts::iterator _nextHost();
  Line::iterator _nextAbandoned();
  Id _begin(Line& line, Line::iterator place);
  // Takes it out of its line.
  Id _remove(Line& line, Line::iterator place);
  void _forgetIfIdle(Hosts::iterator host);

  Hosts hosts_;
  Line abandoned_;  // of all hosts, oldest first
  std::unordered_map<Id, Line::iterator> places_;
  std::string lastHost_;  // whose turn it was
  std::size_t underWay_ = 0;
};

}  // namespace zelkord

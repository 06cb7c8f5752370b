#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <vector>

#include "platform/linux/loop/Loop.h"
#include "platform/linux/url/CurlConnections.h"
#include "platform/linux/url/CurlSettings.h"
#include "platform/linux/url/CurlURLTask.h"
#include "platform/linux/url/TransferPlace.h"

namespace zelkord {

// A session's connections, apart for each identity that its requests carry: requests of two
// identities share neither a connection nor a TLS session to resume. Requests without one go where
// the latest with one went, or to connections that the next identity takes over.
//
// What has ended takes no more requests: its connections close when the last task on them is
// through. Late requests of an ended identity, and those without one that were made before an
// ending, get connections that nobody else uses.
//
// Threading: the loop; made and, once closed, destroyed on any. Ownership: holds the tasks
// under way.
class CurlPartitions final {
 public:
  CurlPartitions(Loop& loop, CurlSettings settings);

  void begin(std::shared_ptr<CurlURLTask> task, CurlURLTask::Order order, TransferPlace place);
  void cancel(CurlURLTask& task);
  void endIdentity(const std::string& identity);
  // Gives up the tasks under way; the caller drops them.
  std::vector<std::shared_ptr<CurlURLTask>> close();

 private:
  struct Partition {
    std::string identity;  // empty: nobody's yet
    std::shared_ptr<CurlConnections> connections;
  };
  using Partitions = std::vector<Partition>;

  CurlConnections& _connectionsFor(const CurlURLTask::Order& order) ZK_REQUIRES(loop_);
  bool _isPast(const CurlURLTask::Order& order) const ZK_REQUIRES(loop_);
  CurlConnections& _add(const std::string& identity) ZK_REQUIRES(loop_);
  std::shared_ptr<CurlConnections> _make() const;
  void _retire(Partitions::iterator partition) ZK_REQUIRES(loop_);
  void _shareIdleConnections() ZK_REQUIRES(loop_);

  // Fixed after construction.
  Loop& loop_;
  const CurlSettings settings_;

  // The loop's.
  bool closed_ ZK_ON(loop_) = false;
  Partitions live_ ZK_ON(loop_);  // the last used by an identity last
  std::vector<std::shared_ptr<CurlConnections>> retired_ ZK_ON(loop_);
  std::deque<std::string> ended_ ZK_ON(loop_);  // the latest last
  std::uint64_t endings_ ZK_ON(loop_) = 0;
};

}  // namespace zelkord

#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "zelkord/feedback/StoredSession.h"
#include "zelkord/storage/ArchivedDataIterator.h"

namespace zelkord {

// Makes a session of a container's bytes.
//
// Records that do not decode are passed over. None when the container is of another version, has no
// header, or its framing is damaged.
//
// Threading: one thread. Ownership: the log outlives this. Errors: logged.
class SessionUnarchiver final {
 public:
  SessionUnarchiver(Data data, const Logger& log) : log_(log), records_(std::move(data), log) {}

  std::optional<StoredSession> read(std::string_view version);

 private:
  bool _checkVersion(std::string_view version);
  bool _readHeader();
  // False at damage.
  bool _readFeedbacks();
  void _addFeedback(std::string_view payload);
  void _refuse(std::string_view payload) const;

  const Logger& log_;
  ArchivedDataIterator records_;
  StoredSession session_;
  std::optional<UUID> userGuid_;
  SharedText userAgent_;
};

}  // namespace zelkord

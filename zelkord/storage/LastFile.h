#pragma once

#include <memory>
#include <utility>

#include "platform/api/ContainerFiles.h"
#include "zelkord/storage/ContainerRoom.h"

namespace zelkord {

// The one container file that stays open between two writes: that of whoever wrote last, since he
// is the likeliest to write next. So hundreds of containers cost one descriptor, and a burst of
// records does not open a file for each.
//
// Threading: one thread at a time, the storage's queue.
class LastFile final {
 public:
  // Null unless `owner` wrote last and nobody else has moved, cut or extended his file since.
  AppendFile* of(ContainerRoom::Id owner) {
    if (file_ && (owner_ != owner || !file_->isIntact())) file_ = nullptr;
    return file_.get();
  }
  AppendFile* keep(ContainerRoom::Id owner, std::unique_ptr<AppendFile> file) {
    owner_ = owner;
    file_ = std::move(file);
    return file_.get();
  }
  void letGo(ContainerRoom::Id owner) {
    if (owner_ == owner) file_ = nullptr;
  }

 private:
  ContainerRoom::Id owner_ = 0;
  std::unique_ptr<AppendFile> file_;
};

}  // namespace zelkord

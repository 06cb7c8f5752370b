#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "base/FunctionRef.h"
#include "platform/api/Log.h"
#include "platform/linux/url_cache/BodyFiles.h"
#include "platform/linux/url_cache/CacheDatabase.h"

namespace zelkord {

// The responses on disk: an index, and files for the bodies that are large.
//
// A body's file is written before its row and removed after it, so that a killed process leaves at
// most a file that nobody knows. Each row has a digest of everything that belongs to the response;
// what does not agree with it was damaged, or lost in a power cut, and is not given out.
//
// States: closed, until there is something to read or write; open. An index that is damaged or of
// another version is removed with all bodies, and a new one begins: `resets` then counts up.
//
// Threading: one thread at a time.
// Errors: logged, once for a series of failed writes. Nothing is given back but what is not there.
class DiskPart final {
 public:
  DiskPart(const std::string& folder, std::uint64_t minimumMappedBytes, Logger log);

  // The entries that are there. Makes no files.
  std::vector<CacheEntry> load();
  // Null when it is not there or damaged.
  StoredPointer read(const CacheEntry& entry);

  struct Changes {
    std::vector<CacheRecord> added;
    CacheIndex::Ids removed;
    CacheIndex::Uses used;
    bool erases = false;  // nothing may be left of what is removed
  };
  struct Outcome {
    CacheIndex::Ids notAdded;
    bool removedRows = true;  // else they are still to be removed
  };
  Outcome write(const Changes& changes);
  void removeOrphans(FunctionRef<bool(std::int64_t id)> isKnown);
  // How often everything was lost.
  unsigned resets() const { return resets_; }

 private:
  struct Batch;

  bool _open();
  bool _openToWrite();
  bool _resetAfter(const sqlite::Failure& failure);
  void _reset(const std::string& reason);
  void _removeAll();
  Outcome _writeOpen(const Changes& changes);
  bool _writeBody(const CacheRecord& record);
  void _addRow(Batch& batch, const CacheRecord& record);
  void _writeRows(const Batch& batch, Outcome& outcome);
  void _complain(const std::string& problem);

  // Fixed after construction.
  const std::uint64_t minimumMappedBytes_;
  const Logger log_;

  BodyFiles files_;
  CacheDatabase database_;
  unsigned resets_ = 0;
  bool failing_ = false;
  // Else what is on disk could not be read at the start. It goes with the first write: its entries
  // would come back later, older than what was kept since.
  bool isKnown_ = true;
};

}  // namespace zelkord

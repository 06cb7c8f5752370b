#include "platform/linux/url_cache/DiskPart.h"

#include <algorithm>
#include <cerrno>
#include <deque>
#include <memory>
#include <optional>
#include <utility>

#include "platform/linux/url_cache/StoredHead.h"

namespace zelkord {
namespace {

Digest recordDigest(const CacheEntry& entry, std::string_view head, std::string_view body) {
  return digestOfParts({bytesOf(entry.url), entry.vary, bytesOf(entry.variant), head, body});
}

}  // namespace

DiskPart::DiskPart(const std::string& folder, std::uint64_t minimumMappedBytes, Logger log)
    : minimumMappedBytes_(std::max<std::uint64_t>(minimumMappedBytes, 1)),
      log_(std::move(log)),
      files_(folder),
      database_(folder + "/index.db") {}

std::vector<CacheEntry> DiskPart::load() {
  std::vector<CacheEntry> entries;
  isKnown_ = !database_.exists();
  if (isKnown_ || !_open()) return entries;
  const auto failure = database_.load(entries);
  isKnown_ = !failure || _resetAfter(*failure);
  if (!failure) return entries;
  if (!isKnown_) _complain(failure->text);
  return {};
}

bool DiskPart::_openToWrite() {
  if (!isKnown_ && !files_.makeFolder()) {
    isKnown_ = true;
    _removeAll();
  }
  return _open();
}

bool DiskPart::_open() {
  if (database_.isOpen()) return true;
  if (const auto error = files_.makeFolder()) {
    _complain(error->reason().value_or(fmt::format("error {}", error->code)));
    return false;
  }
  auto failure = database_.open();
  if (failure && _resetAfter(*failure)) failure = database_.open();
  if (failure) _complain(failure->text);
  return !failure;
}

bool DiskPart::_resetAfter(const sqlite::Failure& failure) {
  if (!failure.isDamage() && !failure.isMisfit() && !CacheDatabase::isForeign(failure)) {
    return false;
  }
  _reset(failure.text);
  return true;
}

void DiskPart::_reset(const std::string& reason) {
  log_.error("the URL cache begins anew: {}", reason);
  ++resets_;
  _removeAll();
}

void DiskPart::_removeAll() {
  database_.remove();
  files_.removeUnless([](std::int64_t) { return false; });
}

void DiskPart::_complain(const std::string& problem) {
  if (!failing_) log_.error("the URL cache cannot be written: {}", problem);
  failing_ = true;
}

StoredPointer DiskPart::read(const CacheEntry& entry) {
  if (!database_.isOpen()) return nullptr;
  StoredPointer stored;
  std::optional<sqlite::Failure> failure;
  const auto take = [&](const CacheDatabase::Row& row) {
    if (row.bodySize > entry.cost) return;
    auto response = decodeStoredHead(row.head);
    const auto body = row.body ? std::optional(Data(std::string(*row.body)))
                               : files_.read(entry.id, row.bodySize);
    if (!response || !body) return;
    if (row.digest != bytesOf(recordDigest(entry, row.head, body->view()))) return;
    response->body = *body;
    stored = std::make_shared<const StoredResponse>(*std::move(response));
  };
  database_.read(entry.id, take, failure);
  if (failure) _resetAfter(*failure);
  return stored;
}

DiskPart::Outcome DiskPart::write(const Changes& changes) {
  if (changes.added.empty() && !database_.isOpen()) return {.removedRows = !database_.exists()};
  if (_openToWrite()) return _writeOpen(changes);
  Outcome outcome{.removedRows = false};
  for (const auto& record : changes.added) outcome.notAdded.push_back(record.entry.id);
  return outcome;
}

bool DiskPart::_writeBody(const CacheRecord& record) {
  const auto body = record.stored->body.view();
  if (body.size() < minimumMappedBytes_) return true;
  const auto error = files_.write(record.entry.id, body);
  if (!error) return true;
  // Somebody has removed the folder.
  if (error->code == ENOENT) _reset("its folder is gone");
  _complain(error->reason().value_or(fmt::format("error {}", error->code)));
  return false;
}

// The rows of a batch of records, and the bytes that they refer to.
struct DiskPart::Batch {
  std::deque<std::string> bytes;
  CacheDatabase::Changes rows;

  std::string_view keep(std::string text) { return bytes.emplace_back(std::move(text)); }
};

void DiskPart::_addRow(Batch& batch, const CacheRecord& record) {
  const auto& [entry, stored] = record;
  const auto body = stored->body.view();
  CacheDatabase::Row row{.head = batch.keep(encodeStoredHead(*stored)), .bodySize = body.size()};
  const auto digest = recordDigest(entry, row.head, body);
  row.digest = batch.keep(std::string(bytesOf(digest)));
  if (body.size() < minimumMappedBytes_) row.body = body;
  batch.rows.added.emplace_back(&entry, row);
}

DiskPart::Outcome DiskPart::_writeOpen(const Changes& changes) {
  Outcome outcome;
  Batch batch;
  batch.rows.removed = &changes.removed;
  batch.rows.used = &changes.used;
  for (const auto& record : changes.added) {
    if (database_.isOpen() && _writeBody(record)) {
      _addRow(batch, record);
    } else {
      outcome.notAdded.push_back(record.entry.id);
    }
  }
  if (database_.isOpen()) _writeRows(batch, outcome);
  if (database_.isOpen() && changes.erases) database_.emptyLog();
  return outcome;
}

void DiskPart::_writeRows(const Batch& batch, Outcome& outcome) {
  const auto failure = database_.write(batch.rows);
  // Even when their rows stay: a full disk needs the room.
  for (const auto id : *batch.rows.removed) files_.remove(id);
  if (!failure) {
    if (outcome.notAdded.empty()) failing_ = false;
    return;
  }
  for (const auto& added : batch.rows.added) {
    outcome.notAdded.push_back(added.first->id);
    files_.remove(added.first->id);
  }
  outcome.removedRows = _resetAfter(*failure);
  if (!outcome.removedRows) _complain(failure->text);
}

void DiskPart::removeOrphans(FunctionRef<bool(std::int64_t id)> isKnown) {
  files_.removeUnless(isKnown);
}

}  // namespace zelkord

#pragma once

#include <memory>
#include <string>
#include <utility>

#include "halvane/ModelFeedback.h"
#include "zelkord/feedback/StoredSession.h"
#include "zelkord/storage/ContainerFormat.h"

namespace zelkord {

// A record that can be told from others.
inline ZelkorFeedback numberedFeedback(std::int64_t queryId, std::uint64_t clientQueryId = 0,
                                       std::string text = "{}") {
  auto custom = std::make_shared<HVCustomFeedback>();
  custom->timestamp = 1;
  custom->jsonFeedback = std::move(text);
  return {.feedback = std::move(custom), .queryId = queryId, .clientQueryId = clientQueryId};
}

inline std::string storedMessage(const ZelkorFeedback& feedback) {
  std::string message;
  appendStoredFeedback({.feedback = feedback.feedback,
                        .queryId = feedback.queryId,
                        .clientQueryId = feedback.clientQueryId},
                       message);
  return message;
}

inline CZClientSession testHeader() {
  CZClientSession header;
  header.agent = "Testing/1.0";
  header.userGuidString = "01234567-89AB-CDEF-0123-456789ABCDEF";
  return header;
}

inline std::string headerMessage() {
  std::string message;
  appendRecord(testHeader(), message);
  return message;
}

inline std::string framed(std::string_view payload) {
  std::string bytes;
  appendFramed(payload, bytes);
  return bytes;
}

// A container of `count` records, numbered from 1.
inline std::string containerBytes(std::string_view version, int count) {
  auto bytes = framed(version) + framed(headerMessage());
  for (int i = 1; i <= count; ++i) bytes += framed(storedMessage(numberedFeedback(i)));
  return bytes;
}

}  // namespace zelkord

#pragma once

#include "base/Namespace.h"

namespace zelkord {

// Answers from memory, on any thread; a change is announced in the notification centre.
class AccountService {
 public:
  virtual ~AccountService() = default;
  virtual bool primaryAccountIsManaged()
      const = 0;  // changes: kAccountStoreChanged, kAccountCredentialsChanged
};

}  // namespace zelkord

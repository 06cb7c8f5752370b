#pragma once

#include "platform/api/AccountService.h"

namespace zelkord {

class FakeAccounts final : public AccountService {
 public:
  bool managed = false;

  bool primaryAccountIsManaged() const override { return managed; }
};

}  // namespace zelkord

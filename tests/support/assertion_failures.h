#pragma once

#include "accountsettings/assertion_failure.h"

namespace tests {

// The assertion failure that a call ends in; where it ends in none, one that says so.
template <typename Call>
accountsettings::AssertionFailure failureOf(Call&& call) {
  try {
    call();
  } catch (const accountsettings::AssertionFailure& failure) {
    return failure;
  }
  return {"", "", "no assertion failure"};
}

}  // namespace tests

#pragma once

#include <cstddef>
#include <cstdint>

#include "accountsettings/accounts_manager.h"
#include "platform/property_value.h"

namespace bench {

// What a settings file of a device with many accounts holds. The same arguments give the same values on every machine.
// Accounts are of the types that devices have, with 15 to 25 keys each; every tenth is a cloud account with two
// children (or as many as asked for), and one in four carries a blob of data. Some calendar accounts belong to a mail
// account of the same user, as in files of early releases.
//
// Every hundred accounts are made up like the first hundred, under other names, so that what an account costs can be
// compared between populations of whole hundreds.
constexpr std::size_t kPopulationPeriod = 100;

// Beside the devices that there are, such as somebody makes up to keep a run busy.
enum class Mixture {
  device,
  pairs,   // each other account is the calendar account of the mail account before it, and is folded into that
  type,    // all are of one type
  family,  // there is one account, and the others are its children
  hosted,  // all are mail accounts of the hosted service, each of which gets a parent
  twins    // each other account has the identifier of the one before it
};

struct Population {
  std::size_t accounts = 1000;
  std::uint64_t version = accountsettings::kCurrentVersion;
  std::size_t children = 2;
  std::uint64_t seed = 20071109;
  Mixture mixture = Mixture::device;
};

// The file's root: the accounts and the version.
[[nodiscard]] platform::Dictionary settingsOf(const Population& population);

// The accounts alone.
[[nodiscard]] platform::Array accountsOf(const Population& population);

}  // namespace bench

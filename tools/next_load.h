#pragma once

#include <string>
#include <string_view>

#include "accountsettings/accounts_manager.h"

// What the library makes of a record when it next loads it: whoever writes one asks here first, so that nothing is
// written that would not last.
namespace tools {

// Why an element of a list of accounts became none, as a clause about it: "its type is unknown".
[[nodiscard]] std::string_view reasonFor(accountsettings::WhyLeftOut why);

// What the next load would do to the record other than keep it as it is, as what follows "the next load would": "drop
// it: it has no class", "set Class to IMAPAccount". Its children count as well. Empty where it keeps everything; that a
// record without an identifier is given one is no fault. The library is asked, and so writes to the log what it makes
// of the record.
[[nodiscard]] std::string faultAtNextLoad(const accountsettings::Dictionary& record);

// The same of what stands in a list of children, as a clause about it: "it has no class". Such an element stays where
// it is, but nobody finds it.
[[nodiscard]] std::string faultOfChild(const accountsettings::PropertyValue& element);

}  // namespace tools

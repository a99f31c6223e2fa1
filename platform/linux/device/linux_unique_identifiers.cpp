#include "platform/linux/device/linux_unique_identifiers.h"

#include <uuid/uuid.h>

#include <array>

namespace platform {
namespace {

class LinuxUniqueIdentifiers final : public UniqueIdentifiers {
 public:
  Result<std::string> makeUuid() override {
    std::array<unsigned char, 16> uuid{};
    ::uuid_generate_random(uuid.data());
    std::array<char, UUID_STR_LEN> text{};
    ::uuid_unparse_upper(uuid.data(), text.data());
    return std::string{text.data()};
  }
};

}  // namespace

std::shared_ptr<UniqueIdentifiers> makeUniqueIdentifiers() { return std::make_shared<LinuxUniqueIdentifiers>(); }

}  // namespace platform

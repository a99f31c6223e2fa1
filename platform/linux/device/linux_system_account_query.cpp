#include "platform/linux/device/device_configuration.h"

namespace platform {
namespace {

class LinuxSystemAccountQuery final : public SystemAccountQuery {
 public:
  [[nodiscard]] Text hostedServiceStatusKey() const override { return StringConstant{"hostedServiceStatus"}; }
  [[nodiscard]] std::optional<Text> primaryAccountKey() const override {
    return Text{StringConstant{"primaryAccount"}};
  }
  [[nodiscard]] Text systemAccountTypeString() const override { return StringConstant{"Cirrant"}; }
};

}  // namespace

std::shared_ptr<SystemAccountQuery> makeSystemAccountQuery() { return std::make_shared<LinuxSystemAccountQuery>(); }

}  // namespace platform

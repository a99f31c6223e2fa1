"""The recipe for a new service of the platform, followed step by step on a copy of the tree, and compiled."""

import os
import subprocess
import unittest

from kit_case import KitTest

SERVICE = """#pragma once

#include <optional>

#include "platform/text.h"

namespace platform {

// Of which colour the device is.
class DeviceColourQuery {
 public:
  virtual ~DeviceColourQuery() = default;
  // Nothing where the device does not say.
  [[nodiscard]] virtual std::optional<Text> colour() const = 0;
};

}  // namespace platform
"""
REAL = """#include "platform/linux/device/device_services.h"

namespace platform {
namespace {

class LinuxDeviceColourQuery final : public DeviceColourQuery {
 public:
  explicit LinuxDeviceColourQuery(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

  [[nodiscard]] std::optional<Text> colour() const override {
    const Dictionary info = _configuration.ofSystem("device-info.plist").valueOr({});
    const Text* const colour = info.text("Colour");
    return colour == nullptr ? std::nullopt : std::optional{*colour};
  }

 private:
  DeviceConfiguration _configuration;
};

}  // namespace

std::shared_ptr<DeviceColourQuery> makeDeviceColourQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxDeviceColourQuery>(std::move(configuration));
}

}  // namespace platform
"""
FAKE = """class FakeDeviceColourQuery final : public platform::DeviceColourQuery {
 public:
  std::optional<platform::Text> answer;
  [[nodiscard]] std::optional<platform::Text> colour() const override { return answer; }
};

"""
USER = """#include "platform/linux/linux_platform.h"
#include "tests/support/fake_platform.h"

bool isGreen(tests::FakeDevice& device) {
  device.deviceColour->answer = platform::Text{"green"};
  return platform::current().deviceColour->colour() == platform::Text{"green"} &&
         !platform::makeLinuxPlatform().deviceColour->colour();
}
"""


class NewService(KitTest):
    PARTS = ("platform/", "tests/support/")

    def write(self, name, text):
        (self.tree / name).write_text(text)

    def insert(self, name, before, line):
        text = self.read(name)
        self.assertEqual(1, text.count(before), f"{name}: {before}")
        self.write(name, text.replace(before, line + before))

    def assert_compiles(self, name):
        ended = subprocess.run(
            [os.environ["CXX"], "-std=c++20", "-fsyntax-only", "-Wall", "-Wextra", "-Werror", f"-I{self.tree}", name],
            cwd=self.tree, capture_output=True, text=True, check=False,
        )
        self.assertEqual((0, ""), (ended.returncode, ended.stderr))

    def test_is_made_in_five_steps(self):
        self.write("platform/device_colour_query.h", SERVICE)
        aggregate, header = "platform/platform.h", "platform/linux/device/device_services.h"
        for name in (aggregate, header):
            self.insert(name, '#include "platform/device_answers.h"', '#include "platform/device_colour_query.h"\n')
        member = "  std::shared_ptr<DeviceColourQuery> deviceColour;\n"
        self.insert(aggregate, "  std::shared_ptr<DeviceInfoQuery>", member)
        self.insert(
            header, "// Fixed for every device.",
            "// ROOT/etc/vorlix/device-info.plist: Colour, a text.\n"
            "[[nodiscard]] std::shared_ptr<DeviceColourQuery> makeDeviceColourQuery(DeviceConfiguration configuration);\n\n",
        )
        self.write("platform/linux/linux_device_colour_query.cpp", REAL)
        self.insert(
            "platform/linux/linux_platform.cpp", "  services.deviceInfo =",
            "  services.deviceColour = makeDeviceColourQuery(configuration);\n",
        )
        fakes = "tests/support/fake_platform.h"
        self.insert(fakes, "class FakeDeviceInfoQuery final", FAKE)
        self.insert(
            fakes, "  std::shared_ptr<FakeDeviceInfoQuery> deviceInfo",
            "  std::shared_ptr<FakeDeviceColourQuery> deviceColour = std::make_shared<FakeDeviceColourQuery>();\n",
        )
        given = "  services.deviceColour = deviceColour;\n"
        self.insert("tests/support/fake_platform.cpp", "  services.deviceInfo =", given)
        self.write("user.cpp", USER)
        for name in (
            "platform/linux/linux_device_colour_query.cpp", "platform/linux/linux_platform.cpp",
            "tests/support/fake_platform.cpp", "user.cpp",
        ):
            self.assert_compiles(name)


if __name__ == "__main__":
    unittest.main()

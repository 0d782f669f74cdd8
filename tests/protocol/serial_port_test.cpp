#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "protocol/serial_port.h"
#include "tests/support/fake_host.h"

namespace xtok {
namespace {

using test::FakeSerialFactory;

TEST(LineCodes, NamesForEveryCodeAndOutOfRange) {
    const std::vector<std::pair<int32_t, std::string>> parity = {
        {0, "none"}, {1, "even"}, {2, "odd"}, {3, "mark"}, {4, "space"}, {5, "none"}, {-1, "none"}};
    for (const auto& [code, name] : parity) {
        EXPECT_EQ(parityName(code), name) << code;
    }
    const std::vector<std::pair<int32_t, std::string>> mode = {
        {0, "RS-232"}, {1, "RS-485"}, {2, "RS-422"}, {3, "RS-485P"}, {4, "RS-232"}, {-7, "RS-232"}};
    for (const auto& [code, name] : mode) {
        EXPECT_EQ(modeName(code), name) << code;
    }
}

TEST(LineCodes, ConfigurationAcceptsOnlyItsOwnNames) {
    const std::vector<std::pair<std::string, int32_t>> parity = {
        {"none", 0}, {"even", 1}, {"odd", 2}, {"mark", 3}, {"space", -1}, {"EVEN", -1}, {"", -1}};
    for (const auto& [name, expected] : parity) {
        int32_t code = -1;
        EXPECT_EQ(parityFromName(name, code), expected >= 0) << name;
        EXPECT_EQ(code, expected) << name;
    }
    const std::vector<std::pair<std::string, int32_t>> mode = {
        {"RS-232", 0}, {"RS-485", 1}, {"RS-422", 2}, {"RS-485P", -1}, {"rs-232", -1}};
    for (const auto& [name, expected] : mode) {
        int32_t code = -1;
        EXPECT_EQ(modeFromName(name, code), expected >= 0) << name;
        EXPECT_EQ(code, expected) << name;
    }
}

TEST(LineCodes, SettingsText) {
    EXPECT_EQ(settingsText("com1", {9600, 1, 8, 1, 0}), "com1,9600,even,8,1,RS-232");
    EXPECT_EQ(settingsText("/dev/ttyUSB0", {115200, 4, 7, 2, 3}),
              "/dev/ttyUSB0,115200,space,7,2,RS-485P");
}

TEST(SerialPort, OpenConfiguresWithTheFiveNumbersInOrder) {
    FakeSerialFactory factory;
    SerialPort port(&factory);
    ASSERT_TRUE(port.Open("com3", {19200, 2, 7, 2, 1}));
    EXPECT_TRUE(port.IsOpen());
    EXPECT_EQ(factory.openedNames(), std::vector<std::string>{"com3"});
    ASSERT_EQ(factory.configured().size(), 1u);
    EXPECT_TRUE((factory.configured()[0] == test::LineSettings{19200, 2, 7, 2, 1}));
    port.Close();
    EXPECT_FALSE(port.IsOpen());
    EXPECT_EQ(factory.closes(), 1);
    port.Close();  // closing twice is harmless
    EXPECT_EQ(factory.closes(), 1);
}

TEST(SerialPort, RefusedSettingsCloseThePortAgain) {
    FakeSerialFactory factory;
    factory.failConfigure = true;
    SerialPort port(&factory);
    EXPECT_FALSE(port.Open("com1", {9600, 1, 8, 1, 0}));
    EXPECT_FALSE(port.IsOpen());
    EXPECT_EQ(factory.opens(), 1);
    EXPECT_EQ(factory.closes(), 1);
}

TEST(SerialPort, RefusedOpen) {
    FakeSerialFactory factory;
    factory.refuseOpen = true;
    SerialPort port(&factory);
    EXPECT_FALSE(port.Open("com9", {9600, 1, 8, 1, 0}));
    EXPECT_FALSE(port.IsOpen());
    EXPECT_FALSE(port.Write("x"));
    EXPECT_FALSE(port.Reconfigure({9600, 1, 8, 1, 0}));
    uint8_t byte = 0;
    EXPECT_FALSE(port.ReadByte(&byte, 10));
}

TEST(SerialPort, DestructorClosesAnOpenPort) {
    FakeSerialFactory factory;
    {
        SerialPort port(&factory);
        ASSERT_TRUE(port.Open("com1", {9600, 1, 8, 1, 0}));
    }
    EXPECT_FALSE(factory.isOpen());
}

TEST(SerialPort, WriteAndReadGoToTheOpenPort) {
    FakeSerialFactory factory;
    SerialPort port(&factory);
    ASSERT_TRUE(port.Open("com1", {9600, 1, 8, 1, 0}));
    EXPECT_TRUE(port.Write(std::string("\x02" "AB\x03", 4)));
    EXPECT_EQ(factory.written(), std::string("\x02" "AB\x03", 4));
    factory.feed("Z");
    uint8_t byte = 0;
    EXPECT_TRUE(port.ReadByte(&byte, 50));
    EXPECT_EQ(byte, 'Z');
    EXPECT_TRUE(port.Reconfigure({4800, 0, 8, 1, 0}));
    EXPECT_EQ(factory.configured().back().baud, 4800);
}

}  // namespace
}  // namespace xtok

#include "devices/device.h"

#include <stdexcept>
#include <string>

#include <gmock/gmock.h>

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::SizeIs;
using testing::StartsWith;

std::string module(const std::string& name) {
    return std::string(ZR_TEST_MODULES) + "/" + name + ".so";
}

// Why the module cannot be used, without the file's name; "loaded" when it can.
std::string load(const std::string& path) {
    try {
        devices::loadDeviceModule(path);
        return "loaded";
    } catch (const std::runtime_error& problem) {
        const std::string text = problem.what();
        EXPECT_THAT(text, StartsWith("device module " + path + ": "));
        return text.substr(text.find(path) + path.size() + 2);
    }
}

devices::Kind kindNamed(const std::string& name) {
    return {.name = name, .summary = "A kind", .open = [](const devices::Request&) {
                return devices::Device();
            }};
}

TEST(DeviceModule, RegistersItsKindOnce) {
    ASSERT_EQ(load(module("board")), "loaded");
    EXPECT_EQ(load(module("board")), "loaded");
    const auto kinds = devices::kinds();
    ASSERT_THAT(kinds, SizeIs(1));
    EXPECT_EQ(kinds[0].name, "board");
    EXPECT_FALSE(kinds[0].takesSpeed);
    EXPECT_EQ(kinds[0].list().front().name, "rev-a");
    EXPECT_EQ(kinds[0].open({.what = "rev-b"}).name, "board rev-b");
    EXPECT_THROW(kinds[0].open({.what = "rev-z"}), std::runtime_error);
}

TEST(DeviceModule, ABadOneIsNamedWithTheReason) {
    devices::registerKind(kindNamed("simulator"));
    const std::size_t before = devices::kinds().size();
    EXPECT_EQ(load("/no/such.so"), "no such file");
    EXPECT_EQ(load(ZR_TEST_MODULES), "not a file");
    EXPECT_EQ(load(std::string(300, 'n')), "File name too long");
    EXPECT_EQ(load(ZR_TEST_MODULES "/../CTestTestfile.cmake"),
              "cannot be loaded: invalid ELF header");
    EXPECT_THAT(load(module("unresolved")),
                AllOf(StartsWith("cannot be loaded: undefined symbol: "),
                      HasSubstr("nobodyHasThisFunction")));
    EXPECT_EQ(load(module("silent")), "it registers no kind of device");
    EXPECT_EQ(load(module("other_version")),
              "it is built for version 5 of the device interface, this is version 4");
    EXPECT_EQ(load(module("taken")), "the kind \"simulator\" is registered already");
    EXPECT_EQ(devices::kinds().size(), before);
}

TEST(DeviceKind, IsRefusedUnlessWellFormed) {
    const std::pair<devices::Kind, const char*> rows[] = {
        {kindNamed(""), "the kind name \"\" is not a letter followed by a-z, 0-9 and -"},
        {kindNamed("Board"), "the kind name \"Board\" is not a letter followed by a-z, 0-9 and -"},
        {kindNamed("2nd"), "the kind name \"2nd\" is not a letter followed by a-z, 0-9 and -"},
        {kindNamed("a:b"), "the kind name \"a:b\" is not a letter followed by a-z, 0-9 and -"},
        {{.name = "idle", .summary = "Opens nothing"}, "the kind \"idle\" cannot open a device"},
    };
    for (const auto& [kind, reason] : rows) {
        devices::registerKind(kind);
        ASSERT_FALSE(devices::refusals().empty());
        EXPECT_EQ(devices::refusals().back(), reason);
    }
}

}  // namespace

// The exported factory and the interface tables as a host reaches them in the built library.
#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <cstring>
#include <string>

#include "tests/plugin/PlugInHost.h"

namespace TolkaTouch {
namespace {

using Testing::PlugInHost;
using Testing::plugInFactory;
using Testing::SinkInstallation;

constexpr Host::UUIDBytes kOtherID = {{1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16}};

// AddRef answers one more than what remains after it, that is two more than before it; this reads
// the references held without changing them.
uint32_t referencesOf(Host::PlugInInterface** plugin) {
    uint32_t answered = (*plugin)->AddRef(plugin);
    (*plugin)->Release(plugin);
    return answered - 2;
}

TEST(TolkaTouchHIDServiceFactoryTest, FactoryGivenAnyOtherTypeReturnsNull) {
    SinkInstallation sinks;
    EXPECT_EQ(plugInFactory()(nullptr, kOtherID), nullptr);
    EXPECT_EQ(plugInFactory()(nullptr, Host::kIUnknownInterfaceID), nullptr);
    EXPECT_EQ(plugInFactory()(nullptr, Host::kHIDServiceInterfaceID), nullptr);
    EXPECT_TRUE(sinks.log->lines().empty());
}

TEST(TolkaTouchHIDServiceFactoryTest, FactoryIgnoresTheAllocator) {
    int allocator = 0;
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(&allocator, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    EXPECT_EQ((*plugin)->Release(plugin), 1u);
}

TEST(TolkaTouchHIDServiceFactoryTest, FreshObjectHoldsOnlyTheHostsReference) {
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    EXPECT_EQ(referencesOf(plugin), 1u);
    (*plugin)->Release(plugin);
}

TEST(TolkaTouchHIDServiceFactoryTest, AddRefReturnsThreeThenReleaseReturnsTwo) {
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    EXPECT_EQ((*plugin)->AddRef(plugin), 3u);  // leaves 2
    EXPECT_EQ((*plugin)->Release(plugin), 2u);  // leaves 1
    EXPECT_EQ((*plugin)->Release(plugin), 1u);  // leaves 0: the service goes
}

TEST(TolkaTouchHIDServiceFactoryTest, LastReleaseDestroysTheService) {
    SinkInstallation sinks;
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    (*plugin)->Release(plugin);
    EXPECT_EQ(sinks.log->messages(), std::vector<std::string>{"dealloc"});
}

TEST(TolkaTouchHIDServiceFactoryTest, QueryInterfaceWithIUnknownReturnsTheFactoryHandleAndAddsOneReference) {
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    void* answer = nullptr;
    EXPECT_EQ((*plugin)->QueryInterface(plugin, Host::kIUnknownInterfaceID, &answer), HIDResult::Success);
    EXPECT_EQ(answer, static_cast<void*>(plugin));
    EXPECT_EQ(referencesOf(plugin), 2u);
    (*plugin)->Release(plugin);
    (*plugin)->Release(plugin);
}

TEST(TolkaTouchHIDServiceFactoryTest, QueryInterfaceWithServiceIdentifierReturnsTheSameObjectsServiceHandle) {
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    Host::HIDServiceInterface** service = nullptr;
    EXPECT_EQ((*plugin)->QueryInterface(plugin, Host::kHIDServiceInterfaceID, reinterpret_cast<void**>(&service)),
              HIDResult::Success);
    ASSERT_NE(service, nullptr);
    EXPECT_NE(static_cast<void*>(service), static_cast<void*>(plugin));
    EXPECT_EQ((*service)->_reserved, (*plugin)->_reserved);
    EXPECT_EQ(referencesOf(plugin), 2u);

    // The service table answers the same questions with the same handles.
    void* again = nullptr;
    EXPECT_EQ((*service)->QueryInterface(service, Host::kIUnknownInterfaceID, &again), HIDResult::Success);
    EXPECT_EQ(again, static_cast<void*>(plugin));
    EXPECT_EQ(referencesOf(plugin), 3u);
    (*service)->Release(service);
    (*service)->Release(service);
    (*plugin)->Release(plugin);
}

TEST(TolkaTouchHIDServiceFactoryTest, QueryInterfaceWithThePlugInTypeOrAnyOtherIdentifierAnswersNoInterface) {
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    int untouched = 0;
    void* answer = &untouched;
    EXPECT_EQ((*plugin)->QueryInterface(plugin, Host::kHIDServicePlugInTypeID, &answer), HIDResult::NoInterface);
    EXPECT_EQ((*plugin)->QueryInterface(plugin, kOtherID, &answer), HIDResult::NoInterface);
    EXPECT_EQ(answer, static_cast<void*>(&untouched));
    EXPECT_EQ(referencesOf(plugin), 1u);
    (*plugin)->Release(plugin);
}

TEST(TolkaTouchHIDServiceFactoryTest, PlugInTableVersionIsOneAndRevisionZero) {
    auto plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    ASSERT_NE(plugin, nullptr);
    EXPECT_EQ((*plugin)->version, 1u);
    EXPECT_EQ((*plugin)->revision, 0u);
    uint32_t together = 0;
    std::memcpy(&together, reinterpret_cast<const uint8_t*>(*plugin) + 32, sizeof together);
    EXPECT_EQ(together, 1u);
    (*plugin)->Release(plugin);
}

TEST(TolkaTouchHIDServiceFactoryTest, EveryTableSlotIsFilled) {
    PlugInHost host;
    ASSERT_NE(host.plugin, nullptr);
    ASSERT_NE(host.service, nullptr);
    const Host::PlugInInterface& plugin = **host.plugin;
    EXPECT_TRUE(plugin._reserved && plugin.QueryInterface && plugin.AddRef && plugin.Release && plugin.Probe &&
                plugin.Start && plugin.Stop);
    const Host::HIDServiceInterface& service = **host.service;
    EXPECT_TRUE(service._reserved && service.open && service.close && service.copyProperty && service.setProperty &&
                service.setEventCallback && service.scheduleWithDispatchQueue &&
                service.unscheduleFromDispatchQueue && service.copyEvent && service.setOutputEvent);
    // The lifetime slots are the same functions in both tables.
    EXPECT_EQ(plugin.QueryInterface, service.QueryInterface);
    EXPECT_EQ(plugin.AddRef, service.AddRef);
    EXPECT_EQ(plugin.Release, service.Release);
}

TEST(TolkaTouchHIDServiceFactoryTest, LibraryExportsOnlyTheFactory) {
    const std::string command = std::string(TOLKA_NM) + " -D --defined-only " + TOLKA_PLUGIN_PATH;
    FILE* pipe = popen(command.c_str(), "r");
    ASSERT_NE(pipe, nullptr);
    std::vector<std::string> names;
    std::array<char, 512> line{};
    while (std::fgets(line.data(), line.size(), pipe)) {
        std::string text = line.data();
        while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
        auto space = text.find_last_of(' ');
        names.push_back(space == std::string::npos ? text : text.substr(space + 1));
    }
    ASSERT_EQ(pclose(pipe), 0);
    EXPECT_EQ(names, std::vector<std::string>{"TolkaTouchHIDServiceFactory"});
}

}  // namespace
}  // namespace TolkaTouch

#include "daemon/UinputKeyOutput.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <libevdev/libevdev.h>
#include <poll.h>
#include <unistd.h>

namespace TolkaTouch {
namespace {

TEST(UinputKeyOutputTest, MissingNodeIsAClearError) {
    try {
        UinputKeyOutput output("/nonexistent/uinput");
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()),
                  "cannot open /nonexistent/uinput for the virtual keyboard: No such file or directory");
    }
}

TEST(UinputKeyOutputTest, NodeThatIsNotUinputIsAClearError) {
    try {
        UinputKeyOutput output("/dev/null");
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()).rfind("cannot create the virtual keyboard on /dev/null: ", 0), 0u)
            << error.what();
    }
}

// Needs a writable /dev/uinput (a VM or a developer's machine); skipped elsewhere.
TEST(UinputKeyOutputTest, EachWriteIsTheKeyEventFollowedBySynReport) {
    if (::access("/dev/uinput", W_OK) != 0) GTEST_SKIP() << "no writable /dev/uinput";
    UinputKeyOutput output;
    ASSERT_FALSE(output.devnode().empty());
    int fd = ::open(output.devnode().c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    ASSERT_GE(fd, 0);
    libevdev* reader = nullptr;
    ASSERT_EQ(libevdev_new_from_fd(fd, &reader), 0);
    EXPECT_STREQ(libevdev_get_name(reader), "TolkaTouch media keys");
    EXPECT_TRUE(libevdev_has_event_code(reader, EV_KEY, KEY_VOICECOMMAND));
    output.write({KEY_VOLUMEUP, KeyValue::Press});
    output.write({KEY_VOLUMEUP, KeyValue::Release});
    std::vector<std::pair<unsigned, unsigned>> seen;
    std::vector<int> values;
    while (seen.size() < 4) {
        pollfd ready{fd, POLLIN, 0};
        if (::poll(&ready, 1, 2000) <= 0) break;
        input_event event;
        while (libevdev_next_event(reader, LIBEVDEV_READ_FLAG_NORMAL, &event) == LIBEVDEV_READ_STATUS_SUCCESS) {
            seen.emplace_back(event.type, event.code);
            values.push_back(event.value);
        }
    }
    libevdev_free(reader);
    ::close(fd);
    EXPECT_EQ(seen, (std::vector<std::pair<unsigned, unsigned>>{
                        {EV_KEY, KEY_VOLUMEUP}, {EV_SYN, SYN_REPORT}, {EV_KEY, KEY_VOLUMEUP}, {EV_SYN, SYN_REPORT}}));
    EXPECT_EQ(values, (std::vector<int>{1, 0, 0, 0}));
}

}  // namespace
}  // namespace TolkaTouch

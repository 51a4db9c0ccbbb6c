#include "daemon/KeyLogOutput.h"

#include <gtest/gtest.h>
#include <linux/input-event-codes.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>

namespace TolkaTouch {
namespace {

TEST(KeyLogOutputTest, EachWriteIsOneLine) {
    char pattern[] = "/tmp/tolkatouchd-keylog-XXXXXX";
    std::string directory = ::mkdtemp(pattern);
    std::string path = directory + "/keys.log";
    {
        KeyLogOutput output(path);
        output.write({KEY_VOLUMEDOWN, 1});
        output.write({KEY_VOLUMEDOWN, 0});
    }
    std::ifstream file(path);
    std::stringstream text;
    text << file.rdbuf();
    EXPECT_EQ(text.str(), "KEY_VOLUMEDOWN 1\nKEY_VOLUMEDOWN 0\n");
    std::filesystem::remove_all(directory);
}

TEST(KeyLogOutputTest, FileThatCannotBeMadeIsAClearError) {
    try {
        KeyLogOutput output("/nonexistent-directory/keys.log");
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()), "cannot open key log /nonexistent-directory/keys.log: No such file or directory");
    }
}

}  // namespace
}  // namespace TolkaTouch

#include "tools/WatchPrinter.h"

#include <gtest/gtest.h>

namespace TolkaTouch::Tools {
namespace {

TEST(WatchPrinterTest, ALogLineShowsLevelCategoryFrameAndTheMessageWithItsNewlines) {
    EXPECT_EQ(watchLineText(R"({"log":{"category":"Algs","frame":1323,"level":"debug","message":"Frame 1323\nts=0.0"}})"),
              "[debug] Algs (frame 1323): Frame 1323\nts=0.0\n");
}

TEST(WatchPrinterTest, ALogLineWithoutAFrameShowsNone) {
    EXPECT_EQ(watchLineText(R"({"log":{"category":"Daemon","level":"default","message":"serving"}})"),
              "[default] Daemon: serving\n");
}

TEST(WatchPrinterTest, AnImageReportIsDrawnAsShowDrawsIt) {
    const std::string line =
        R"({"report":{"service":1,"bytes":"01 2b 05 00 00 38 58 00 00 00 00 00 00 7d 06 67 07 eb 05 3a 06 2a 08 fa 06 8d 07 1f 06 51 07 be 05 27 08 ff 07 13 08 23 06 3d 08 05 00 fe ff 02 00 fb ff fe ff ff ff fc ff 00 00 ff ff 00 00 fc ff 01 00 fe ff 01 00 00 00"}})";
    const std::string text = watchLineText(line);
    EXPECT_EQ(text.substr(0, text.find('\n')), "# Image frame 1323    time 22584 ms");
}

TEST(WatchPrinterTest, AFirmwareEventReportIsNamed) {
    EXPECT_EQ(watchLineText(R"({"report":{"service":1,"bytes":"02 00 00 00 00 00 00 00 00 00"}})"),
              "firmware event 0 (reset), context 0x0000000000000000\n");
}

TEST(WatchPrinterTest, AnEventShowsItsKindRegionAndFrame) {
    EXPECT_EQ(watchLineText(R"({"event":{"frame":1114,"event":"tap","region":1,"phase":0}})"),
              "event tap region 1 (frame 1114)\n");
}

TEST(WatchPrinterTest, DroppedLinesAreCounted) {
    EXPECT_EQ(watchLineText(R"({"dropped":12})"),
              "(12 lines dropped: the service writes faster than this terminal reads)\n");
}

TEST(WatchPrinterTest, ControlCharactersFromTheStreamAreShownEscaped) {
    EXPECT_EQ(watchLineText(R"({"log":{"category":"A\u001b[2J","level":"error","message":"x\u0007"}})"),
              "[error] A\\x1b[2J: x\\x07\n");
}

TEST(WatchPrinterTest, ALineThatDoesNotReadIsShownAsUnreadable) {
    EXPECT_EQ(watchLineText("not json\x1b"), "unreadable line from tolkatouchd: not json\\x1b\n");
    EXPECT_EQ(watchLineText(R"({"other":1})"), "unreadable line from tolkatouchd: {\"other\":1}\n");
}

}  // namespace
}  // namespace TolkaTouch::Tools

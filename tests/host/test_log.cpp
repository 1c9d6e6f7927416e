// The log's line layout, piece by piece. The log is process-wide state that can only be opened
// once, so its whole life is one test.
#include <gtest/gtest.h>

#include <regex>

#include "doubles/log_platform_memory.h"

namespace {

std::string Narrow(const std::u16string& s) { return std::string(s.begin(), s.end()); }

std::vector<std::string> TakePieces() {
    std::vector<std::string> out;
    for (const auto& p : logdouble::pieces) out.push_back(Narrow(p));
    logdouble::pieces.clear();
    return out;
}

TEST(Log, WholeLifeOfTheLog) {
    LogWrite(0, u"early", u"dropped", 1);
    LogWriteText(3, u"early", u"dropped");
    EXPECT_TRUE(TakePieces().empty()) << "writes before LogOpen are dropped";

    LogOpen(u"C:\\docs\\x.log");
    EXPECT_EQ(logdouble::openedPath, u"C:\\docs\\x.log");
    std::vector<std::string> start = TakePieces();
    ASSERT_EQ(start.size(), 4u);
    EXPECT_EQ(start[0], "QZ_CW_startLOG");
    EXPECT_EQ(start[1], " : ");
    EXPECT_TRUE(std::regex_match(start[2], std::regex("Started logging\\.\\.\\.[A-Z][a-z]{2} [A-Z][a-z]{2} [0-3][0-9] "
                                                      "[0-2][0-9]:[0-5][0-9]:[0-5][0-9] [0-9]{4}\n")))
        << start[2];
    EXPECT_EQ(start[3], "\r\n");

    LogOpen(u"C:\\other.log");
    EXPECT_EQ(logdouble::opens, 1);
    EXPECT_TRUE(TakePieces().empty()) << "a second LogOpen writes no second start line";

    LogWrite(0, u"A", u"b", 7);
    EXPECT_EQ(TakePieces(), (std::vector<std::string>{"A", " : ", "b : 7", "\r\n"}));
    LogWrite(-1, u"A", u"below the threshold", 7);
    EXPECT_TRUE(TakePieces().empty());
    LogWrite(3, u"T", u"Unexpected Error. Error loading files.", 1012);
    LogWrite(3, u"T", u"CL interpretation", -767);
    LogWrite(100, u"T", u"", 0);
    EXPECT_EQ(TakePieces(), (std::vector<std::string>{"T", " : ", "Unexpected Error. Error loading files. : 1012", "\r\n",
                                                      "T", " : ", "CL interpretation : -767", "\r\n",  //
                                                      "T", " : ", " : 0", "\r\n"}));
    LogWriteText(0, u"tag", u"");
    EXPECT_EQ(TakePieces(), (std::vector<std::string>{"tag", " : ", "", "\r\n"}));

    LogClose();
    EXPECT_EQ(TakePieces(), (std::vector<std::string>{"Ended logging...", " : ", "", "\r\n"}));
    EXPECT_TRUE(logdouble::closed);

    // After the close the handle keeps its value: writes are attempted, fail, and say so on stdout.
    testing::internal::CaptureStdout();
    LogWrite(0, u"A", u"b", 1);
    std::string out = testing::internal::GetCapturedStdout();
    EXPECT_TRUE(TakePieces().empty());
    std::string once = "WriteFile failed with error 6.\n";
    EXPECT_EQ(out, once + once + once + once);
}

}  // namespace

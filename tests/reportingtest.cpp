#include "services/reporting.h"
#include "services/exception.h"
#include "services/mutex.h"

#include <cpl_conv.h>
#include <cpl_error.h>
#include <gtest/gtest.h>

#include <string>
#include <thread>

namespace {

std::string gText;

void KeepText(CPLErr, int, const char* pszText) {
    gText = pszText;
}

} // namespace

TEST(Reporting, HandlersOfTheHostGetWholeTextsAsTheyAre) {
    const std::string text = FormatString("%d %s%%s", 7, std::string(20000, 'x').c_str());
    EXPECT_EQ(text, "7 " + std::string(20000, 'x') + "%s");
    CPLPushErrorHandler(KeepText);
    kelm::tellus::Warning::Warn(text, "tin/tinreader", 12);
    EXPECT_EQ(gText, text + " (tin/tinreader:12)");
    CPLSetThreadLocalConfigOption("CPL_DEBUG", "TIN");
    kelm::tellus::Report::AddInfo(text);
    EXPECT_EQ(gText, "TIN: " + text);
    CPLSetThreadLocalConfigOption("CPL_DEBUG", nullptr);
    CPLPopErrorHandler();
}

TEST(Exceptions, ReachTheirBasesWithAllTheyHold) {
    try {
        throw kelm::ParameterException("dfScale", kelm::ParameterException::PT_Invalid, "0.0",
                                       "non-zero", "text", "tin/tinreader", "void F()", 42);
    } catch (const kelm::DataException& oData) {
        EXPECT_STREQ(oData.what(), "text");
        EXPECT_EQ(oData.GetMessage(), "text");
        EXPECT_EQ(oData.GetSourcePath(), "tin/tinreader");
        EXPECT_EQ(oData.GetFunction(), "void F()");
        EXPECT_EQ(oData.GetLine(), 42U);
        const auto& oParameter = dynamic_cast<const kelm::ParameterException&>(oData);
        EXPECT_EQ(oParameter.GetParameter(), "dfScale");
        EXPECT_EQ(oParameter.GetType(), 1);
        EXPECT_EQ(oParameter.GetActual(), "0.0");
        EXPECT_EQ(oParameter.GetExpected(), "non-zero");
    }
}

TEST(Mutex, KeepsThreadsApart) {
    kelm::threading::Mutex oMutex;
    int nCount = 0;
    const auto Work = [&] {
        for (int i = 0; i < 20000; ++i) {
            oMutex.Lock();
            ++nCount;
            oMutex.Unlock();
        }
    };
    std::thread oOther(Work);
    Work();
    oOther.join();
    EXPECT_EQ(nCount, 40000);
}

#pragma once

#include "services/exception.h"

#include <gtest/gtest.h>

namespace kelm::test {

/// @return what the refusal says that the work ends in: its source, for an argument its name with
/// the actual and the expected value, and the message; empty if there is none
template <typename Work>
std::string GetRefusal(const Work& work) {
    const auto tell = [](const Exception& e, const std::string& argument) {
        EXPECT_EQ(e.GetLine() == 0, e.GetFunction().empty());
        EXPECT_STREQ(e.what(), e.GetMessage().c_str());
        return e.GetSourcePath() + ": " + argument + e.GetMessage();
    };
    try {
        work();
    } catch (const ParameterException& e) {
        EXPECT_EQ(e.GetType(), ParameterException::PT_Invalid);
        return tell(e, e.GetParameter() + '=' + e.GetActual() + '!' + e.GetExpected() + ": ");
    } catch (const DataException& e) {
        return tell(e, "");
    } catch (const Exception& e) {
        return tell(e, "no data: ");
    }
    return "";
}

} // namespace kelm::test

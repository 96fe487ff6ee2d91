#pragma once

#include "services/exception.h"

#include <fnmatch.h>
#include <gtest/gtest.h>

#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace kelm::test {

/// What a test is told: refusals, warnings and notes, in order. At its end they are compared,
/// whole, with its section of tests/transcripts.txt, where a * stands for a text that is not ours.
struct Transcript {
    Transcript() = default;
    Transcript(const Transcript&) = delete;
    ~Transcript() {
        const auto* const info = testing::UnitTest::GetInstance()->current_test_info();
        const std::string found = Take(), name = std::string(info->test_suite_name()) + '.';
        const std::string expected = FindSection('[' + name + info->name() + ']');
        std::istringstream lines(found), patterns(expected);
        for (std::string line, pattern; getline(lines, line) || getline(patterns, pattern);) {
            getline(patterns, pattern);
            if (fnmatch(pattern.c_str(), line.c_str(), FNM_NOESCAPE) != 0) {
                ADD_FAILURE() << "expected: " << pattern << "\nall that was told:\n" << found;
                return;
            }
        }
    }

    /// Adds the refusal that the work ends in: its source, for an argument its name with the actual
    /// and the expected value, and the message. @return is there one?
    template <typename Work>
    bool Refuses(const Work& work) {
        const auto tell = [this](const Exception& e, const std::string& argument) {
            EXPECT_EQ(e.GetLine() == 0, e.GetFunction().empty());
            moLines += e.GetSourcePath() + ": " + argument + e.what() + '\n';
            return true;
        };
        try {
            return work(), false;
        } catch (const ParameterException& e) {
            EXPECT_EQ(e.GetType(), ParameterException::PT_Invalid);
            return tell(e, e.GetParameter() + '=' + e.GetActual() + '!' + e.GetExpected() + ": ");
        } catch (const DataException& e) {
            return tell(e, "");
        } catch (const Exception& e) {
            return tell(e, "no data: ");
        }
    }

    /// @return the lines since the last call, without numbers of source lines, and ~ for the folder
    std::string Take() {
        std::string lines = std::exchange(moLines, "");
        for (std::size_t at = 0; !moFolder.empty() && (at = lines.find(moFolder, at)) + 1 != 0;)
            lines.replace(at, moFolder.size(), "~");
        for (std::size_t end = 0; (end = lines.find(")\n", end + 1)) + 1 != 0;) {
            const std::size_t colon = lines.find_last_not_of("0123456789", end - 1);
            if (colon + 1 == end || lines[colon] != ':')
                continue;
            lines.erase(colon, end - colon);
            end = colon;
        }
        return lines;
    }

    std::string moLines;
    std::string moFolder;

  private:
    static std::string FindSection(const std::string& title) {
        std::ifstream file(KELM_TIN_DATA_DIR "/../tests/transcripts.txt");
        std::string section, line;
        while (getline(file, line) && line != title)
            continue;
        while (getline(file, line) && line.rfind('[', 0) != 0)
            section += line + '\n';
        return section;
    }
};

} // namespace kelm::test

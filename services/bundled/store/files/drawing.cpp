#include "services/bundled/store/files/drawing.h"

#include "services/bundled/store/files/vsifile.h"
#include "services/reporting.h"

#include <cpl_string.h>

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

namespace kelm::store {

namespace {

constexpr std::string_view BINARY_MARK = "AutoCAD Binary DXF";
constexpr std::string_view BYTE_ORDER_MARK = "\xEF\xBB\xBF";
constexpr int COMMENT = 999;

/// The lines of a file, as GDAL parts them: at CR, LF, CR LF or LF CR.
class LineReader {
  public:
    explicit LineReader(VSILFILE& file) : mrFile(file), moBuffer(BUFFER) {}

    /// Reads the next line. @return false behind the last one
    bool Next();
    /// @return the line without the blanks around it, good until the next call of Next; of a very
    /// long one not all
    std::string_view GetText() const;
    long long GetNumber() const { return mnNumber; }
    bool HasZeroByte() const { return mbZeroByte; }
    /// @return true if a carriage return ends the line and the file
    bool EndsInReturn() const { return mbEndsInReturn; }

  private:
    static constexpr std::size_t BUFFER = 1 << 16;
    static constexpr std::size_t KEPT = 1 << 10;

    std::size_t FindBreak(std::size_t at) const;
    bool Refill(std::size_t& rAt);
    std::size_t ScanLine();
    void EndLine(std::size_t at);

    VSILFILE& mrFile;
    std::vector<char> moBuffer;
    std::size_t mnLine = 0; ///< where the line begins in the buffer
    std::size_t mnSize = 0; ///< of the line
    std::size_t mnNext = 0; ///< where the next one begins
    std::size_t mnFilled = 0;
    long long mnNumber = 0;
    bool mbZeroByte = false;
    bool mbEndsInReturn = false;
};

/// @return the place of the next line end or zero byte, or the end of what is read
std::size_t LineReader::FindBreak(std::size_t at) const {
    const char* const bytes = moBuffer.data();
    for (; at < mnFilled; ++at)
        if (static_cast<unsigned char>(bytes[at]) <= '\r' &&
            (bytes[at] == '\n' || bytes[at] == '\r' || bytes[at] == 0))
            break;
    return at;
}

/// Reads on, with the bytes from the beginning of the line kept. @param rAt a place behind that
/// beginning, which moves with the bytes. @return false at the end of the file
bool LineReader::Refill(std::size_t& rAt) {
    std::copy(moBuffer.begin() + static_cast<std::ptrdiff_t>(mnLine),
              moBuffer.begin() + static_cast<std::ptrdiff_t>(mnFilled), moBuffer.begin());
    rAt -= mnLine;
    mnFilled -= std::exchange(mnLine, 0);
    if (mnFilled == moBuffer.size())
        rAt = mnFilled = KEPT;
    const std::size_t count =
        VSIFReadL(moBuffer.data() + mnFilled, 1, moBuffer.size() - mnFilled, &mrFile);
    mnFilled += count;
    return count > 0;
}

/// @return the place of the line end, or the end of the file
std::size_t LineReader::ScanLine() {
    std::size_t at = FindBreak(mnLine);
    while ((at < mnFilled && moBuffer[at] == 0) || (at == mnFilled && Refill(at))) {
        if (at < mnFilled && moBuffer[at] == 0) {
            mbZeroByte = true;
            ++at;
        }
        at = FindBreak(at);
    }
    return at;
}

bool LineReader::Next() {
    mnLine = mnNext;
    mbZeroByte = false;
    const std::size_t end = ScanLine();
    if (mnLine == mnFilled)
        return false;
    ++mnNumber;
    EndLine(end);
    return true;
}

void LineReader::EndLine(std::size_t at) {
    while (mnFilled - at < 3 && Refill(at))
        continue;
    mnSize = at - mnLine;
    const auto peek = [this](std::size_t place) {
        return place < mnFilled ? moBuffer[place] : '\0';
    };
    const char end = peek(at);
    const bool pair = peek(at + 1) == (end == '\r' ? '\n' : '\r');
    mnNext = std::min(mnFilled, at + (pair ? 2 : 1));
    mbEndsInReturn = end == '\r' && !pair && mnNext == mnFilled;
}

std::string_view LineReader::GetText() const {
    // 26 ended texts in old systems.
    constexpr std::string_view BLANKS = " \t\x1a";
    std::string_view text(moBuffer.data() + mnLine, mnSize);
    text.remove_prefix(std::min(text.size(), text.find_first_not_of(BLANKS)));
    return text.substr(0, text.find_last_not_of(BLANKS) + 1);
}

bool StartsWith(std::string_view text, std::string_view start) {
    return text.substr(0, start.size()) == start;
}

bool IsWord(std::string_view text, const char* word) {
    return EQUAL(std::string(text).c_str(), word);
}

/// Follows the pairs of a group code and a value.
class DrawingTest {
  public:
    explicit DrawingTest(VSILFILE& file) : moLines(file) {}
    std::string Run();

  private:
    bool ReadCode();
    bool ReadValue();
    bool SkipBlankEnd();
    bool IsAtEnd();
    bool Fail(const char* found);

    LineReader moLines;
    int mnCode = 0;
    bool mbSection = false;
    bool mbEntities = false;
    std::string moFault;
};

std::string DrawingTest::Run() {
    while (ReadCode() && ReadValue() && !IsAtEnd())
        continue;
    return moFault;
}

bool DrawingTest::Fail(const char* found) {
    moFault = FormatString("line %lld of the drawing is damaged: %s", moLines.GetNumber(), found);
    return false;
}

/// @return false at the end of the drawing, or if it is damaged
bool DrawingTest::ReadCode() {
    if (!moLines.Next())
        return false;
    if (moLines.HasZeroByte())
        return Fail("it holds a zero byte");
    std::string_view text = moLines.GetText();
    if (text.empty())
        return SkipBlankEnd();
    if (moLines.GetNumber() == 1 && StartsWith(text, BINARY_MARK))
        return Fail("the drawing is a binary one, only those of text are read");
    if (moLines.GetNumber() == 1 && StartsWith(text, BYTE_ORDER_MARK))
        text.remove_prefix(BYTE_ORDER_MARK.size());
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), mnCode);
    if (error != std::errc() || end != text.data() + text.size())
        return Fail("a group code must be a whole number");
    return true;
}

/// Blank lines may follow the last pair. @return false
bool DrawingTest::SkipBlankEnd() {
    do {
        if (!moLines.GetText().empty())
            return Fail("a blank line stands where a group code must");
        if (moLines.EndsInReturn())
            return Fail("the file ends within a line end");
    } while (moLines.Next());
    return false;
}

bool DrawingTest::ReadValue() {
    if (!moLines.Next())
        return Fail("the file ends between a group code and its value");
    if (moLines.HasZeroByte())
        return Fail("it holds a zero byte");
    if (moLines.EndsInReturn())
        return Fail("the file ends within a line end");
    return true;
}

/// GDAL reads no further than the end of the entities.
bool DrawingTest::IsAtEnd() {
    if (mnCode == COMMENT)
        return false;
    const bool section = std::exchange(mbSection, false);
    if (mnCode == 2 && section)
        mbEntities = mbEntities || IsWord(moLines.GetText(), "ENTITIES");
    if (mnCode != 0)
        return false;
    const std::string_view value = moLines.GetText();
    mbSection = IsWord(value, "SECTION");
    return (mbEntities && IsWord(value, "ENDSEC")) || IsWord(value, "EOF");
}

} // namespace

std::string FindDrawingFault(const std::string& name) {
    const VsiFile file = OpenVsiFile(name);
    return file ? DrawingTest(*file).Run() : std::string();
}

} // namespace kelm::store

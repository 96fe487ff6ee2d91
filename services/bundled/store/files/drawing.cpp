#include "services/bundled/store/files/drawing.h"

#include "services/bundled/store/files/vsifile.h"
#include "services/reporting.h"

#include <cpl_string.h>

#include <vector>

namespace kelm::store {

namespace {

constexpr int END = -1;
/// Longer than any text that is compared.
constexpr std::size_t KEPT = 32;
constexpr const char* BINARY_MARK = "AutoCAD Binary DXF";
constexpr int COMMENT = 999;

/// 26 ended texts in old systems.
bool IsBlank(int byte) {
    return byte == ' ' || byte == '\t' || byte == 26;
}

/// The lines of a file, as GDAL parts them: at CR, LF, CR LF or LF CR.
class LineReader {
  public:
    explicit LineReader(VSILFILE& file) : mrFile(file), moBuffer(BUFFER) {}

    /// Reads the next line. @return false behind the last one
    bool Next();
    /// @return the beginning of the line, without the blanks around it
    const std::string& GetText() const { return moText; }
    long long GetNumber() const { return mnNumber; }
    bool HasZeroByte() const { return mbZeroByte; }
    /// @return true if a carriage return ends the line and the file
    bool EndsInReturn() const { return mbReturn && mbLast; }

  private:
    static constexpr std::size_t BUFFER = 1 << 16;

    int Peek();
    void EndLine(int end);

    VSILFILE& mrFile;
    std::vector<char> moBuffer;
    std::size_t mnNext = 0;
    std::size_t mnFilled = 0;
    std::string moText;
    long long mnNumber = 0;
    bool mbZeroByte = false;
    bool mbReturn = false;
    bool mbLast = false;
};

/// @return the next byte, which stays the next one, or END
int LineReader::Peek() {
    if (mnNext == mnFilled) {
        mnNext = 0;
        mnFilled = VSIFReadL(moBuffer.data(), 1, moBuffer.size(), &mrFile);
        if (mnFilled == 0)
            return END;
    }
    return static_cast<unsigned char>(moBuffer[mnNext]);
}

bool LineReader::Next() {
    if (Peek() == END)
        return false;
    ++mnNumber;
    moText.clear();
    mbZeroByte = false;
    int byte = Peek();
    for (; byte != END && byte != '\n' && byte != '\r'; byte = Peek()) {
        ++mnNext;
        mbZeroByte = mbZeroByte || byte == 0;
        if (moText.size() < KEPT && !(moText.empty() && IsBlank(byte)))
            moText.push_back(static_cast<char>(byte));
    }
    EndLine(byte);
    while (!moText.empty() && IsBlank(moText.back()))
        moText.pop_back();
    return true;
}

void LineReader::EndLine(int end) {
    if (end != END)
        ++mnNext;
    const int partner = end == '\r' ? '\n' : '\r';
    const bool pair = end != END && Peek() == partner;
    if (pair)
        ++mnNext;
    mbReturn = end == '\r' && !pair;
    mbLast = Peek() == END;
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
    const std::string& text = moLines.GetText();
    if (moLines.GetNumber() == 1 && STARTS_WITH(text.c_str(), BINARY_MARK))
        return Fail("the drawing is a binary one, only those of text are read");
    if (moLines.HasZeroByte())
        return Fail("it holds a zero byte");
    if (text.empty())
        return SkipBlankEnd();
    constexpr const char* BYTE_ORDER_MARK = "\xEF\xBB\xBF";
    const std::size_t from = STARTS_WITH(text.c_str(), BYTE_ORDER_MARK) ? 3 : 0;
    const std::size_t digits = text.find_first_not_of(' ', from);
    const std::size_t sign = text.find_first_of("+-", digits) == digits ? 1 : 0;
    if (text.size() == digits + sign ||
        text.find_first_not_of("0123456789", digits + sign) != std::string::npos)
        return Fail("a group code must be a whole number");
    mnCode = std::atoi(text.c_str() + digits);
    return true;
}

/// Blank lines may follow the last pair. @return false
bool DrawingTest::SkipBlankEnd() {
    while (moLines.Next())
        if (!moLines.GetText().empty())
            return Fail("a blank line stands where a group code must");
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
    const char* value = moLines.GetText().c_str();
    mbEntities = mbEntities || (mbSection && mnCode == 2 && EQUAL(value, "ENTITIES"));
    mbSection = mnCode == 0 && EQUAL(value, "SECTION");
    return mnCode == 0 && ((mbEntities && EQUAL(value, "ENDSEC")) || EQUAL(value, "EOF"));
}

} // namespace

std::string FindDrawingFault(const std::string& name) {
    const VsiFile file = OpenVsiFile(name);
    return file ? DrawingTest(*file).Run() : std::string();
}

} // namespace kelm::store

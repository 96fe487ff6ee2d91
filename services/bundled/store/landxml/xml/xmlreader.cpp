#include "services/bundled/store/landxml/xml/xmlreader.h"

#include "services/reporting.h"

#include <expat.h>

#include <cstring>
#include <new>

namespace kelm::store::landxml {

namespace {

constexpr int PIECE = 1 << 18;
/// A tag or comment is read again with each piece until its end is there.
constexpr std::int64_t LONGEST_TOKEN = 1 << 22;
/// A root element begins within so many bytes, behind a comment or two.
constexpr std::int64_t LONGEST_PROLOG = 1 << 16;

std::string_view DropPrefix(std::string_view name) {
    return name.substr(name.find(':') + 1);
}

XmlReader& GetReader(void* data) {
    return *static_cast<XmlReader*>(data);
}

void XMLCALL HandleStart(void* data, const XML_Char* name, const XML_Char** attributes) {
    GetReader(data).Guard(
        [&](XmlHandler& handler) { handler.Start(DropPrefix(name), Attributes(attributes)); });
}

void XMLCALL HandleEnd(void* data, const XML_Char*) {
    GetReader(data).Guard([](XmlHandler& handler) { handler.End(); });
}

void XMLCALL HandleText(void* data, const XML_Char* text, int length) {
    GetReader(data).Guard([&](XmlHandler& handler) {
        handler.AddText({text, static_cast<std::size_t>(length)});
    });
}

int XMLCALL RefuseExternal(XML_Parser parser, const XML_Char*, const XML_Char*, const XML_Char*,
                           const XML_Char*) {
    GetReader(XML_GetUserData(parser)).Fail("an entity that stands outside the document");
    return XML_STATUS_ERROR;
}

void XMLCALL RefuseSkipped(void* data, const XML_Char*, int) {
    GetReader(data).Fail("an entity that stands outside the document");
}

/// The single-byte encodings of Windows and ISO share ASCII, of which all numbers are made. Other
/// letters, which only names have, are read as Latin 1.
int XMLCALL FindEncoding(void*, const XML_Char* name, XML_Encoding* encoding) {
    constexpr std::string_view FAMILIES[] = {"windows-125", "iso-8859-"};
    std::string lower(name);
    for (char& letter : lower)
        letter = static_cast<char>(letter >= 'A' && letter <= 'Z' ? letter - 'A' + 'a' : letter);
    for (const std::string_view family : FAMILIES)
        if (lower.compare(0, family.size(), family) == 0) {
            for (int byte = 0; byte < 256; ++byte)
                encoding->map[byte] = byte;
            encoding->convert = nullptr;
            encoding->release = nullptr;
            return XML_STATUS_OK;
        }
    return XML_STATUS_ERROR;
}

/// @return what is wrong, or null
const char* GetErrorText(XML_Error error) {
    switch (error) {
    case XML_ERROR_NONE:
        return nullptr;
    case XML_ERROR_NO_ELEMENTS:
    case XML_ERROR_UNCLOSED_TOKEN:
    case XML_ERROR_UNCLOSED_CDATA_SECTION:
    case XML_ERROR_PARTIAL_CHAR:
        return "the document ends early";
    default:
        return XML_ErrorString(error);
    }
}

/// Keeps the name of the first element.
class RootFinder final : public XmlHandler {
  public:
    std::string Find(std::istream& stream) {
        moReader.Read(stream, LONGEST_PROLOG);
        return moName;
    }
    void Start(std::string_view name, const Attributes&) override {
        moName = name;
        moReader.Stop();
    }
    void End() override {}
    void AddText(std::string_view) override {}

  private:
    XmlReader moReader{*this};
    std::string moName;
};

} // namespace

const char* Attributes::Find(std::string_view name) const {
    for (const char* const* pair = mpPairs; *pair != nullptr; pair += 2)
        if (name == *pair)
            return pair[1];
    return nullptr;
}

std::string Attributes::Get(std::string_view name) const {
    const char* value = Find(name);
    return value ? value : "";
}

XmlReader::XmlReader(XmlHandler& handler)
    : moHandler(handler), mpoParser(XML_ParserCreate(nullptr), XML_ParserFree) {
    if (!mpoParser)
        throw std::bad_alloc();
    XML_SetUserData(mpoParser.get(), this);
    XML_SetElementHandler(mpoParser.get(), HandleStart, HandleEnd);
    XML_SetCharacterDataHandler(mpoParser.get(), HandleText);
    XML_SetExternalEntityRefHandler(mpoParser.get(), RefuseExternal);
    XML_SetSkippedEntityHandler(mpoParser.get(), RefuseSkipped);
    XML_SetUnknownEncodingHandler(mpoParser.get(), FindEncoding, nullptr);
}

XmlReader::~XmlReader() = default;

std::string XmlReader::Read(std::istream& stream, std::int64_t most) {
    while (ReadPiece(stream, most))
        continue;
    if (moThrown)
        std::rethrow_exception(moThrown);
    return mbStopped ? std::string() : GetFault();
}

/// @return true if there is more to read
bool XmlReader::ReadPiece(std::istream& stream, std::int64_t& rest) {
    void* piece = XML_GetBuffer(mpoParser.get(), PIECE);
    if (piece == nullptr)
        throw std::bad_alloc();
    const std::int64_t wanted = rest < 0 || rest > PIECE ? PIECE : rest;
    stream.read(static_cast<char*>(piece), wanted);
    if (stream.bad())
        mpszFault = "the file cannot be read on";
    const std::int64_t length = stream.gcount();
    mnGiven += length;
    rest -= rest < 0 ? 0 : length;
    const bool last = length < wanted || rest == 0;
    if (XML_ParseBuffer(mpoParser.get(), static_cast<int>(length), last) != XML_STATUS_OK)
        return false;
    TestToken();
    return !last && mpszFault == nullptr;
}

void XmlReader::TestToken() {
    if (mnGiven - XML_GetCurrentByteIndex(mpoParser.get()) > LONGEST_TOKEN)
        mpszFault = "a tag or comment of more than 4 MiB";
}

std::string XmlReader::GetFault() const {
    const XML_Error error = XML_GetErrorCode(mpoParser.get());
    if (error == XML_ERROR_NO_MEMORY)
        throw std::bad_alloc();
    const char* fault = mpszFault ? mpszFault : GetErrorText(error);
    return fault ? FormatString("line %llu: %s", static_cast<unsigned long long>(GetLine()), fault)
                 : std::string();
}

void XmlReader::Stop() {
    mbStopped = true;
    XML_StopParser(mpoParser.get(), XML_FALSE);
}

void XmlReader::Fail(const char* text) {
    mpszFault = text;
    XML_StopParser(mpoParser.get(), XML_FALSE);
}

std::uint64_t XmlReader::GetLine() const {
    return XML_GetCurrentLineNumber(mpoParser.get());
}

template <class Work>
void XmlReader::Guard(const Work& work) noexcept {
    if (moThrown || mbStopped)
        return;
    try {
        work(moHandler);
    } catch (...) {
        moThrown = std::current_exception();
        XML_StopParser(mpoParser.get(), XML_FALSE);
    }
}

std::string ReadRootName(std::istream& stream) {
    return RootFinder().Find(stream);
}

} // namespace kelm::store::landxml

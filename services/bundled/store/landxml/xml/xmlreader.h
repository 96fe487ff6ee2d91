#pragma once

#include <cstdint>
#include <exception>
#include <istream>
#include <memory>
#include <string>
#include <string_view>

struct XML_ParserStruct;

namespace kelm::store::landxml {

/// The attributes of a start tag; good while the tag is handled.
class Attributes {
  public:
    explicit Attributes(const char* const* pairs) : mpPairs(pairs) {}
    /// @return the value, or null if there is none of this name
    const char* Find(std::string_view name) const;
    /// @return the value, or empty
    std::string Get(std::string_view name) const;

  private:
    const char* const* mpPairs;
};

/// Takes the parts of a document as they are read. Names come without prefix, all texts in UTF-8.
class XmlHandler {
  public:
    virtual ~XmlHandler() = default;
    virtual void Start(std::string_view name, const Attributes& attributes) = 0;
    virtual void End() = 0;
    /// A piece of text; one text can come in many pieces.
    virtual void AddText(std::string_view piece) = 0;
};

/// Reads a document in pieces, by expat: its size does not matter to the memory.
///
/// Nothing outside the document is ever read. A document that refers to something outside where
/// its content should be is refused, and so is one whose entities expand beyond reason.
class XmlReader {
  public:
    /// @param handler outlives the reader
    explicit XmlReader(XmlHandler& handler);
    ~XmlReader();

    /// Reads to the end of the document or of the limit. @param most bytes at most, or -1
    /// @return what is wrong with the document, with the line, or empty
    /// @throw what the handler throws
    std::string Read(std::istream& stream, std::int64_t most = -1);
    /// Ends the reading; called by the handler.
    void Stop();
    /// @return the line that the part being handled begins in, from 1
    std::uint64_t GetLine() const;

    /// Runs a handler. Called by expat, which an exception must not cross.
    template <class Work>
    void Guard(const Work& work) noexcept;
    /// Ends the reading with a fault. @param text what is wrong
    void Fail(const char* text);

  private:
    bool ReadPiece(std::istream& stream, std::int64_t& rest);
    void TestToken();
    std::string GetFault() const;

    XmlHandler& moHandler;
    std::unique_ptr<XML_ParserStruct, void (*)(XML_ParserStruct*)> mpoParser;
    std::exception_ptr moThrown; ///< what a handler threw
    const char* mpszFault = nullptr;
    bool mbStopped = false;
    std::int64_t mnGiven = 0; ///< bytes that expat has
};

/// @return the name of the root element without its prefix; empty if the beginning is no XML
std::string ReadRootName(std::istream& stream);

} // namespace kelm::store::landxml

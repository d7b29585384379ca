// An in-memory XML document over RapidXML: parsed from text or a file, or built element by
// element, and written back as indented UTF-8 text.
#pragma once

#include <cstddef>
#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "lib/xml/XmlElement.h"

namespace rapidxml {
template <class Ch>
class xml_document;
}

namespace vek::xml {

class XmlDocumentRapid {
public:
    // Deeper nesting is refused before parsing: the parser recurses once per level.
    static constexpr size_t kMaxDepth = 256;
    static constexpr size_t kMaxFileBytes = 64u << 20;

    XmlDocumentRapid();
    ~XmlDocumentRapid();
    XmlDocumentRapid(const XmlDocumentRapid&) = delete;
    XmlDocumentRapid& operator=(const XmlDocumentRapid&) = delete;

    // nullptr (and the reason in *error) when the text is not well-formed.
    static std::shared_ptr<XmlDocumentRapid> fromText(std::string_view text, std::string* error = nullptr);
    // Throws filesystem::FileException when the file cannot be read; nullptr (and the reason in
    // *error) when it is not well-formed.
    static std::shared_ptr<XmlDocumentRapid> fromFile(const std::filesystem::path& path, std::string* error = nullptr);

    XmlElement root() const noexcept;
    // Replaces any existing content by a single empty root element.
    XmlElement createRoot(std::string_view name);

    std::string toText() const;
    // Writes the text crash-safely (see filesystem::writeFileAtomically); `createFolders`
    // creates missing parent folders. Throws filesystem::FileException on failure.
    void save(const std::filesystem::path& path, bool createFolders) const;

private:
    bool parse(std::string* error);

    std::unique_ptr<rapidxml::xml_document<char>> doc_;
    std::vector<char> buffer_;  // parsed text; the document's strings point into it
};

}  // namespace vek::xml

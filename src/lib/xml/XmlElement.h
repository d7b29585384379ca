// A non-owning handle to an element of an XmlDocumentRapid; valid while the document lives.
// A default-constructed handle is null and every query on it yields nothing.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace rapidxml {
template <class Ch>
class xml_node;
}

namespace vek::xml {

class XmlElement {
public:
    XmlElement() noexcept = default;
    explicit operator bool() const noexcept { return node_ != nullptr; }

    std::string_view name() const noexcept;

    std::optional<std::string_view> attribute(std::string_view name) const noexcept;
    void setAttribute(std::string_view name, std::string_view value);  // replaces an existing one

    // The element's own character data (child elements excluded).
    std::string text() const;
    void setText(std::string_view text);

    XmlElement appendChild(std::string_view name);
    XmlElement firstChild() const noexcept;   // child elements only; text is skipped
    XmlElement nextSibling() const noexcept;  // the next element beside this one

    friend bool operator==(const XmlElement& a, const XmlElement& b) noexcept { return a.node_ == b.node_; }

private:
    friend class XmlDocumentRapid;
    explicit XmlElement(rapidxml::xml_node<char>* node) noexcept : node_(node) {}
    rapidxml::xml_node<char>* node_ = nullptr;
};

// Whether `name` may stand as an element or attribute name.
bool isValidXmlName(std::string_view name) noexcept;

}  // namespace vek::xml

// The catalogue reader's document tree: elements with attributes, children in document order and
// their joined character data, built by DOMParser from Expat's events.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "ui/expatpp.h"

namespace GUI_Common {

class DOMElement;

class DOMNode {
public:
    enum Type { ELEMENT_NODE = 1 };

    explicit DOMNode(Type type, DOMElement* parent = nullptr) : type_(type), parent_(parent) {}
    virtual ~DOMNode() = default;
    DOMNode(const DOMNode&) = delete;
    DOMNode& operator=(const DOMNode&) = delete;

    Type nodeType() const noexcept { return type_; }
    DOMElement* parent() const noexcept { return parent_; }

private:
    Type type_;
    DOMElement* parent_;  // not owned
};

struct DOMAttribute {
    std::string name;
    std::string value;
};

class DOMElement : public DOMNode {
public:
    DOMElement(std::string name, DOMElement* parent = nullptr) : DOMNode(ELEMENT_NODE, parent), name_(std::move(name)) {}
    // Tears the subtree down without recursion, so any depth of nesting is safe.
    ~DOMElement() override;

    const std::string& name() const noexcept { return name_; }
    const std::vector<DOMAttribute>& attributes() const noexcept { return attributes_; }
    // Null when the attribute is absent.
    const std::string* attribute(std::string_view name) const;
    const std::vector<std::unique_ptr<DOMNode>>& children() const noexcept { return children_; }
    const std::string& text() const noexcept { return text_; }

    void addAttribute(std::string name, std::string value) { attributes_.push_back({std::move(name), std::move(value)}); }
    DOMElement* appendElement(std::string name);
    void appendText(std::string_view text) { text_.append(text); }

private:
    std::string name_;
    std::vector<DOMAttribute> attributes_;
    std::vector<std::unique_ptr<DOMNode>> children_;
    std::string text_;
};

class DOMParser : public expatpp {
public:
    // Parses one whole document. On an error a diagnostic line goes to standard error and the
    // result is false; the partial tree is dropped.
    bool parseData(const char* data, size_t length);
    // The document element of a successful parse (null before, or after a failure).
    std::unique_ptr<DOMElement> releaseRoot() noexcept { return std::move(root_); }
    const DOMElement* root() const noexcept { return root_.get(); }

protected:
    void startElement(const XML_Char* name, const XML_Char** attributes) override;
    void endElement(const XML_Char* name) override;
    void charData(const XML_Char* text, int length) override;

private:
    std::unique_ptr<DOMElement> root_;
    DOMElement* current_ = nullptr;  // the open element; null outside the root
};

// Parses `text` and returns its document element, or null (after the diagnostic) when the text is
// not well-formed.
std::unique_ptr<DOMElement> ParseDocument(std::string_view text);

}  // namespace GUI_Common

#include "ui/DOM.h"

#include <iostream>
#include <sstream>

namespace GUI_Common {

DOMElement::~DOMElement() {
    // Move grandchildren up into one flat list before their parents die, so no destructor ever
    // finds more than one level below it.
    std::vector<std::unique_ptr<DOMNode>> pending = std::move(children_);
    while (!pending.empty()) {
        std::unique_ptr<DOMNode> node = std::move(pending.back());
        pending.pop_back();
        if (node->nodeType() == ELEMENT_NODE) {
            auto& element = static_cast<DOMElement&>(*node);
            for (auto& child : element.children_) pending.push_back(std::move(child));
            element.children_.clear();
        }
    }
}

const std::string* DOMElement::attribute(std::string_view name) const {
    for (const DOMAttribute& a : attributes_)
        if (a.name == name) return &a.value;
    return nullptr;
}

DOMElement* DOMElement::appendElement(std::string name) {
    children_.push_back(std::make_unique<DOMElement>(std::move(name), this));
    return static_cast<DOMElement*>(children_.back().get());
}

bool DOMParser::parseData(const char* data, size_t length) {
    if (expatpp::parseData(data, length, true)) return root_ != nullptr;
    std::ostringstream line;
    line << "GUI_Common::DOMParser::parseData" << " - parser error   :" << errorText() << " - stopped at line:" << errorLine()
         << " column:" << errorColumn() << " bytes:" << errorByteIndex() << '\n';
    std::cerr << line.str() << std::flush;
    root_.reset();
    current_ = nullptr;
    return false;
}

void DOMParser::startElement(const XML_Char* name, const XML_Char** attributes) {
    DOMElement* element = nullptr;
    if (current_ != nullptr) {
        element = current_->appendElement(name);
    } else {
        root_ = std::make_unique<DOMElement>(name);
        element = root_.get();
    }
    for (const XML_Char** a = attributes; a != nullptr && a[0] != nullptr && a[1] != nullptr; a += 2)
        element->addAttribute(a[0], a[1]);
    current_ = element;
}

void DOMParser::endElement(const XML_Char*) {
    if (current_ != nullptr) current_ = current_->parent();
}

void DOMParser::charData(const XML_Char* text, int length) {
    if (current_ == nullptr || length <= 0) return;
    // Line structure of the file is not part of a text: tabs and line ends go, spaces stay.
    std::string kept;
    kept.reserve(static_cast<size_t>(length));
    for (int i = 0; i < length; ++i) {
        const char c = text[i];
        if (c != '\t' && c != '\n' && c != '\r') kept.push_back(c);
    }
    current_->appendText(kept);
}

std::unique_ptr<DOMElement> ParseDocument(std::string_view text) {
    DOMParser parser;
    if (!parser.parseData(text.data(), text.size())) return nullptr;
    return parser.releaseRoot();
}

}  // namespace GUI_Common

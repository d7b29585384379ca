#include "lib/xml/XmlElement.h"

#include <rapidxml/rapidxml.hpp>

namespace vek::xml {
namespace {

using Node = rapidxml::xml_node<char>;

char* copyIntoDocument(Node* node, std::string_view text) {
    // Sized strings: names and values need not be terminated, and an empty one needs no storage.
    if (text.empty()) return nullptr;
    return node->document()->allocate_string(text.data(), text.size());
}

Node* nextElement(Node* n) {
    while (n && n->type() != rapidxml::node_element) n = n->next_sibling();
    return n;
}

bool isCharacterData(const Node* n) {
    return n->type() == rapidxml::node_data || n->type() == rapidxml::node_cdata;
}

}  // namespace

std::string_view XmlElement::name() const noexcept {
    if (!node_) return {};
    return {node_->name(), node_->name_size()};
}

std::optional<std::string_view> XmlElement::attribute(std::string_view name) const noexcept {
    if (!node_ || name.empty()) return std::nullopt;
    const auto* a = node_->first_attribute(name.data(), name.size());
    if (!a) return std::nullopt;
    return std::string_view(a->value(), a->value_size());
}

void XmlElement::setAttribute(std::string_view name, std::string_view value) {
    if (!node_ || name.empty()) return;
    auto* doc = node_->document();
    char* v = copyIntoDocument(node_, value);
    if (auto* a = node_->first_attribute(name.data(), name.size())) {
        a->value(v ? v : "", value.size());
        return;
    }
    char* n = copyIntoDocument(node_, name);
    node_->append_attribute(doc->allocate_attribute(n, v ? v : "", name.size(), value.size()));
}

std::string XmlElement::text() const {
    std::string out;
    if (!node_) return out;
    for (Node* n = node_->first_node(); n; n = n->next_sibling())
        if (isCharacterData(n)) out.append(n->value(), n->value_size());
    return out;
}

void XmlElement::setText(std::string_view text) {
    if (!node_) return;
    for (Node* n = node_->first_node(); n;) {
        Node* next = n->next_sibling();
        if (isCharacterData(n)) node_->remove_node(n);
        n = next;
    }
    node_->value("", 0);
    if (text.empty()) return;
    char* v = copyIntoDocument(node_, text);
    node_->prepend_node(node_->document()->allocate_node(rapidxml::node_data, nullptr, v, 0, text.size()));
}

XmlElement XmlElement::appendChild(std::string_view name) {
    if (!node_) return {};
    auto* doc = node_->document();
    char* n = copyIntoDocument(node_, name);
    Node* child = doc->allocate_node(rapidxml::node_element, n ? n : "", nullptr, name.size(), 0);
    node_->append_node(child);
    return XmlElement(child);
}

XmlElement XmlElement::firstChild() const noexcept {
    return XmlElement(node_ ? nextElement(node_->first_node()) : nullptr);
}

XmlElement XmlElement::nextSibling() const noexcept {
    return XmlElement(node_ ? nextElement(node_->next_sibling()) : nullptr);
}

bool isValidXmlName(std::string_view name) noexcept {
    if (name.empty()) return false;
    auto start = [](unsigned char c) {
        return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || c == '_' || c == ':' || c >= 0x80;
    };
    auto rest = [&](unsigned char c) { return start(c) || (c >= '0' && c <= '9') || c == '-' || c == '.'; };
    if (!start(static_cast<unsigned char>(name[0]))) return false;
    for (char c : name.substr(1))
        if (!rest(static_cast<unsigned char>(c))) return false;
    return true;
}

}  // namespace vek::xml

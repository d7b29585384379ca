#include "lib/xml/XmlWriter.h"

#include <rapidxml/rapidxml.hpp>

#include <string_view>

namespace vek::xml {
namespace {

using Node = rapidxml::xml_node<char>;

// Escapes what the parser would otherwise take as markup, and writes line breaks and other
// control characters as references so attribute values keep them exactly.
void appendEscaped(std::string& out, std::string_view text, bool attribute) {
    for (const char c : text) {
        switch (c) {
            case '&': out += "&amp;"; break;
            case '<': out += "&lt;"; break;
            case '>': out += "&gt;"; break;
            case '"':
                if (attribute)
                    out += "&quot;";
                else
                    out += c;
                break;
            default: {
                const auto u = static_cast<unsigned char>(c);
                if (u < 0x20 && (attribute || (c != '\n' && c != '\t'))) {
                    out += "&#";
                    out += std::to_string(u);
                    out += ';';
                } else {
                    out += c;
                }
            }
        }
    }
}

bool isCharacterData(const Node* n) {
    return n->type() == rapidxml::node_data || n->type() == rapidxml::node_cdata;
}

void writeElement(std::string& out, const Node* e, int depth) {
    const std::string indent(static_cast<size_t>(depth), '\t');
    out += indent;
    out += '<';
    out.append(e->name(), e->name_size());
    for (auto* a = e->first_attribute(); a; a = a->next_attribute()) {
        out += ' ';
        out.append(a->name(), a->name_size());
        out += "=\"";
        appendEscaped(out, {a->value(), a->value_size()}, true);
        out += '"';
    }
    bool hasChildren = false;
    bool hasText = false;
    for (auto* n = e->first_node(); n; n = n->next_sibling()) {
        hasChildren |= n->type() == rapidxml::node_element;
        hasText |= isCharacterData(n);
    }
    if (!hasChildren && !hasText) {
        out += "/>\n";
        return;
    }
    out += '>';
    if (hasText) {
        // Mixed content is written without layout: added blanks would change the text.
        for (auto* n = e->first_node(); n; n = n->next_sibling()) {
            if (isCharacterData(n)) {
                appendEscaped(out, {n->value(), n->value_size()}, false);
            } else if (n->type() == rapidxml::node_element) {
                std::string inner;
                writeElement(inner, n, 0);
                inner.pop_back();  // its line break
                out += inner;
            }
        }
    } else {
        out += '\n';
        for (auto* n = e->first_node(); n; n = n->next_sibling())
            if (n->type() == rapidxml::node_element) writeElement(out, n, depth + 1);
        out += indent;
    }
    out += "</";
    out.append(e->name(), e->name_size());
    out += ">\n";
}

}  // namespace

std::string writeXml(const Node* element) {
    if (!element) return {};
    std::string out = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";
    writeElement(out, element, 0);
    return out;
}

}  // namespace vek::xml

#include "lib/xml/XmlDocumentRapid.h"

#include <rapidxml/rapidxml.hpp>

#include "lib/filesystem/AtomicFile.h"
#include "lib/xml/XmlWriter.h"

namespace vek::xml {
namespace {

// An upper bound of the element nesting, found without recursion. Comments, CDATA, processing
// instructions and quoted attribute values are skipped so that a '<' inside them is not counted.
bool nestingWithin(std::string_view s, size_t limit) {
    size_t depth = 0;
    size_t i = 0;
    auto skipPast = [&](std::string_view terminator) {
        const size_t end = s.find(terminator, i);
        i = end == std::string_view::npos ? s.size() : end + terminator.size();
    };
    while (i < s.size()) {
        if (s[i] != '<') {
            ++i;
            continue;
        }
        const std::string_view rest = s.substr(i);
        if (rest.starts_with("<!--")) {
            skipPast("-->");
        } else if (rest.starts_with("<![CDATA[")) {
            skipPast("]]>");
        } else if (rest.starts_with("<?")) {
            skipPast("?>");
        } else if (rest.starts_with("<!")) {
            skipPast(">");
        } else if (rest.starts_with("</")) {
            if (depth > 0) --depth;
            skipPast(">");
        } else {
            ++i;
            char quote = 0;
            bool selfClosing = false;
            for (; i < s.size(); ++i) {
                const char c = s[i];
                if (quote) {
                    if (c == quote) quote = 0;
                } else if (c == '"' || c == '\'') {
                    quote = c;
                } else if (c == '>') {
                    selfClosing = s[i - 1] == '/';
                    ++i;
                    break;
                }
            }
            if (!selfClosing && ++depth > limit) return false;
        }
    }
    return true;
}

}  // namespace

XmlDocumentRapid::XmlDocumentRapid() : doc_(std::make_unique<rapidxml::xml_document<char>>()) {}

XmlDocumentRapid::~XmlDocumentRapid() = default;

bool XmlDocumentRapid::parse(std::string* error) {
    const std::string_view text(buffer_.data(), buffer_.size() - 1);
    if (!nestingWithin(text, kMaxDepth)) {
        if (error) *error = "elements nested deeper than " + std::to_string(kMaxDepth) + " levels";
        return false;
    }
    try {
        doc_->parse<rapidxml::parse_validate_closing_tags>(buffer_.data());
    } catch (const rapidxml::parse_error& e) {
        if (error) {
            *error = e.what();
            const char* where = e.where<char>();
            if (where >= buffer_.data() && where < buffer_.data() + buffer_.size())
                *error += " at offset " + std::to_string(where - buffer_.data());
        }
        doc_->clear();
        return false;
    }
    if (!root()) {
        if (error) *error = "no root element";
        return false;
    }
    return true;
}

std::shared_ptr<XmlDocumentRapid> XmlDocumentRapid::fromText(std::string_view text, std::string* error) {
    try {
        auto doc = std::make_shared<XmlDocumentRapid>();
        doc->buffer_.reserve(text.size() + 1);
        doc->buffer_.assign(text.begin(), text.end());
        doc->buffer_.push_back('\0');
        if (!doc->parse(error)) return nullptr;
        return doc;
    } catch (const std::exception& e) {  // out of memory
        if (error) *error = e.what();
        return nullptr;
    }
}

std::shared_ptr<XmlDocumentRapid> XmlDocumentRapid::fromFile(const std::filesystem::path& path, std::string* error) {
    const std::string content = filesystem::readWholeFile(path, kMaxFileBytes);
    return fromText(content, error);
}

XmlElement XmlDocumentRapid::root() const noexcept {
    for (auto* n = doc_->first_node(); n; n = n->next_sibling())
        if (n->type() == rapidxml::node_element) return XmlElement(n);
    return {};
}

XmlElement XmlDocumentRapid::createRoot(std::string_view name) {
    doc_->clear();
    buffer_.clear();
    char* n = name.empty() ? nullptr : doc_->allocate_string(name.data(), name.size());
    auto* node = doc_->allocate_node(rapidxml::node_element, n ? n : "", nullptr, name.size(), 0);
    doc_->append_node(node);
    return XmlElement(node);
}

std::string XmlDocumentRapid::toText() const {
    for (auto* n = doc_->first_node(); n; n = n->next_sibling())
        if (n->type() == rapidxml::node_element) return writeXml(n);
    return {};
}

void XmlDocumentRapid::save(const std::filesystem::path& path, bool createFolders) const {
    filesystem::writeFileAtomically(path, toText(), createFolders);
}

}  // namespace vek::xml

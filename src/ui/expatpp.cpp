#include "ui/expatpp.h"

expatpp::expatpp() : parser_(XML_ParserCreate("UTF-8")) {
    if (parser_ == nullptr) return;
    XML_SetUserData(parser_, this);
    XML_SetElementHandler(parser_, &expatpp::onStart, &expatpp::onEnd);
    XML_SetCharacterDataHandler(parser_, &expatpp::onChars);
}

expatpp::~expatpp() {
    if (parser_ != nullptr) XML_ParserFree(parser_);
}

bool expatpp::parseData(const char* data, size_t length, bool isFinal) {
    if (parser_ == nullptr) return false;
    // Expat takes an int length: feed large texts in slices so nothing is cut at 2 GB.
    constexpr size_t slice = size_t{1} << 30;
    do {
        const size_t now = length < slice ? length : slice;
        length -= now;
        const bool last = isFinal && length == 0;
        if (XML_Parse(parser_, data, static_cast<int>(now), last) == XML_STATUS_ERROR) return false;
        data += now;
    } while (length > 0);
    return true;
}

std::string expatpp::errorText() const {
    if (parser_ == nullptr) return "out of memory";
    const XML_LChar* text = XML_ErrorString(XML_GetErrorCode(parser_));
    return text != nullptr ? text : "";
}

unsigned long expatpp::errorLine() const { return parser_ ? XML_GetCurrentLineNumber(parser_) : 0; }
unsigned long expatpp::errorColumn() const { return parser_ ? XML_GetCurrentColumnNumber(parser_) : 0; }
long long expatpp::errorByteIndex() const { return parser_ ? XML_GetCurrentByteIndex(parser_) : -1; }

void XMLCALL expatpp::onStart(void* self, const XML_Char* name, const XML_Char** attributes) {
    static_cast<expatpp*>(self)->startElement(name, attributes);
}
void XMLCALL expatpp::onEnd(void* self, const XML_Char* name) { static_cast<expatpp*>(self)->endElement(name); }
void XMLCALL expatpp::onChars(void* self, const XML_Char* text, int length) {
    static_cast<expatpp*>(self)->charData(text, length);
}

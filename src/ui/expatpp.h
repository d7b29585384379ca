// A thin object wrapper over Expat's event parser: a subclass overrides the three events it cares
// about and feeds text with parseData. One parser per document.
#pragma once

#include <cstddef>
#include <string>

#include <expat.h>

class expatpp {
public:
    expatpp();
    virtual ~expatpp();
    expatpp(const expatpp&) = delete;
    expatpp& operator=(const expatpp&) = delete;

    // Feeds a piece of the document; isFinal marks the last one. False on a well-formedness error
    // (details through the accessors below) or when the parser could not be created.
    bool parseData(const char* data, size_t length, bool isFinal);

    bool valid() const noexcept { return parser_ != nullptr; }
    std::string errorText() const;
    unsigned long errorLine() const;
    unsigned long errorColumn() const;
    long long errorByteIndex() const;

protected:
    // Attributes come as Expat gives them: name, value, name, value, ..., null.
    virtual void startElement(const XML_Char* name, const XML_Char** attributes) {}
    virtual void endElement(const XML_Char* name) {}
    virtual void charData(const XML_Char* text, int length) {}

private:
    static void XMLCALL onStart(void* self, const XML_Char* name, const XML_Char** attributes);
    static void XMLCALL onEnd(void* self, const XML_Char* name);
    static void XMLCALL onChars(void* self, const XML_Char* text, int length);

    XML_Parser parser_;
};

// Turns a RapidXML element tree into indented UTF-8 text (internal to the XML classes).
#pragma once

#include <string>

namespace rapidxml {
template <class Ch>
class xml_node;
}

namespace vek::xml {

// An XML declaration followed by the element; an empty string for a null element.
std::string writeXml(const rapidxml::xml_node<char>* element);

}  // namespace vek::xml

#include "config/Configuration.h"

#include <boost/any.hpp>
#include <boost/core/demangle.hpp>

#include <algorithm>
#include <map>
#include <string>
#include <typeinfo>
#include <utility>

#include "config/ConfigurationException.h"
#include "config/PropertyTypes.h"
#include "lib/debug/Log.h"
#include "lib/filesystem/Path.h"
#include "lib/text/Format.h"
#include "lib/xml/XmlDocumentRapid.h"

namespace vek::plugin_common {
namespace {

using text::FastString;
using xml::XmlElement;
using debug::Level;

// The source name this store's log and assertion records carry.
constexpr std::string_view kSource = "Configuration";
constexpr std::string_view kPropertyWithoutAttributes =
    "While parsing configuration XML document, found that a property has no 'name' or 'value' attribute!";
constexpr std::string_view kGroupWithoutName =
    "While parsing configuration XML document, found that group a has no 'name' attribute!";

void warn(int line, std::string_view message) { debug::log(Level::Warning, kSource, line, message); }
void assertion(int line, std::string_view expression) { debug::logAssertion(kSource, line, expression); }

[[noreturn]] void parseFailure(int line, std::string_view message) {
    warn(line, message);
    throw ConfigurationException(std::string(message));
}

// Byte order with bytes taken as signed values, so names with bytes of 0x80 and above (UTF-8
// beyond ASCII) sort before plain ASCII, as the files have always been written.
struct SignedByteLess {
    bool operator()(const FastString& a, const FastString& b) const noexcept {
        const std::string_view x = a.view(), y = b.view();
        return std::lexicographical_compare(x.begin(), x.end(), y.begin(), y.end(), [](char l, char r) {
            return static_cast<signed char>(l) < static_cast<signed char>(r);
        });
    }
};

using PropertyMap = std::map<FastString, boost::any, SignedByteLess>;

// --- writing ---------------------------------------------------------------------------------

template <class T>
bool writeIfHeld(XmlElement key, const boost::any& value) {
    if (value.type() != typeid(T)) return false;
    using Type = detail::PropertyType<T>;
    key.setAttribute("type", Type::xmlName);
    const T& held = boost::any_cast<const T&>(value);
    if constexpr (Type::isArray) {
        for (const auto& element : held)
            key.appendChild(Type::elementTag).setAttribute("value", Type::ElementType::toText(element));
    } else {
        key.setAttribute("value", Type::toText(held));
    }
    return true;
}

template <class... Ts>
void writeValue(detail::TypeList<Ts...>, XmlElement key, const boost::any& value) {
    if ((writeIfHeld<Ts>(key, value) || ...)) return;
    const std::string typeName = boost::core::demangle(value.type().name());
    warn(__LINE__, text::formatMessage("Couldn't convert '%*' to string.", {typeName}));
    key.setAttribute("type", typeName);
    key.setAttribute("value", "");
}

// --- reading ---------------------------------------------------------------------------------

template <class T>
bool convertIfNamed(std::string_view typeName, std::string_view text, boost::any& out) {
    using Type = detail::PropertyType<T>;
    if constexpr (Type::isArray) {
        return false;
    } else {
        if (typeName != Type::xmlName) return false;
        out = Type::fromText(text);
        return true;
    }
}

template <class... Ts>
bool convertScalar(detail::TypeList<Ts...>, std::string_view typeName, std::string_view text, boost::any& out) {
    return (convertIfNamed<Ts>(typeName, text, out) || ...);
}

std::string_view requiredAttribute(XmlElement element, std::string_view name, int line) {
    const auto value = element.attribute(name);
    if (!value) parseFailure(line, kPropertyWithoutAttributes);
    return *value;
}

void conversionFailure(std::string_view text, std::string_view typeName) {
    warn(__LINE__, text::formatMessage("Error while trying to convert the string '%*' to the type '%*'! Returning empty "
                                       "boost::any.",
                                       {text, typeName}));
}

template <class Array>
boost::any readArray(XmlElement key) {
    using Type = detail::PropertyType<Array>;
    Array values;
    for (XmlElement item = key.firstChild(); item; item = item.nextSibling()) {
        const std::string_view text = requiredAttribute(item, "value", __LINE__);
        try {
            values.push_back(Type::ElementType::fromText(text));
        } catch (const std::exception&) {
            conversionFailure(text, Type::xmlName);
            return {};
        }
    }
    return values;
}

boost::any readValue(XmlElement key, std::string_view typeName) {
    using StringArrayType = detail::PropertyType<std::vector<FastString>>;
    using FloatArrayType = detail::PropertyType<std::vector<float>>;
    if (typeName == StringArrayType::xmlName) return readArray<std::vector<FastString>>(key);
    if (typeName == FloatArrayType::xmlName) return readArray<std::vector<float>>(key);

    const std::string_view text = requiredAttribute(key, "value", __LINE__);
    if (typeName == detail::PropertyType<FastString>::xmlName) {
        // A value that once failed to convert was saved as its error text; loading it would
        // hand that text out as a setting.
        if (text.find("Couldn't convert") != std::string_view::npos) {
            assertion(__LINE__, "text.find(\"Couldn't convert\") == npos");
            warn(__LINE__, "Tried to load a property that previously couldn't be converted to a string.");
            return {};
        }
        return FastString(text);
    }
    boost::any value;
    try {
        if (!convertScalar(detail::PropertyTypes{}, typeName, text, value)) value = FastString(text);
    } catch (const std::exception&) {
        conversionFailure(text, typeName);
        return {};
    }
    return value;
}

}  // namespace

struct Configuration::Intern {
    std::vector<FastString> _groups;
    std::vector<PropertyMap> _groupsPropertyLists;

    // The property list of a group, or nullptr (with the assertion logged) for a bad index.
    PropertyMap* listAt(int32_t groupIndex, int line) {
        if (groupIndex < 0 || static_cast<size_t>(groupIndex) >= _groupsPropertyLists.size()) {
            assertion(line, "groupIndex < _groupsPropertyLists.size()");
            return nullptr;
        }
        return &_groupsPropertyLists[static_cast<size_t>(groupIndex)];
    }

    bool setAny(int32_t groupIndex, const FastString& property, boost::any value, int line) {
        if (property.empty()) {
            assertion(line, "!propertyName.empty()");
            return false;
        }
        if (value.empty()) {
            assertion(line, "!value.empty()");
            return false;
        }
        PropertyMap* list = listAt(groupIndex, line);
        if (!list) return false;
        (*list)[property] = std::move(value);
        return true;
    }
};

struct Configuration::Snapshot {
    FastString fileName, name, version;
    Intern intern;
};

// --- construction ------------------------------------------------------------------------------

Configuration::Configuration() : name_("configuration"), _intern(std::make_unique<Intern>()) {}

Configuration::Configuration(const FastString& fileName) : Configuration() { loadFromFile(fileName); }

Configuration::Configuration(const std::shared_ptr<const Configuration>& other) : Configuration() {
    if (!other) {
        assertion(__LINE__, "other");
        return;
    }
    copyContent(*other);
}

Configuration::~Configuration() = default;

void Configuration::copyContent(const Configuration& other) {
    if (&other == this) return;
    auto intern = std::make_unique<Intern>(*other._intern);
    fileName_ = other.fileName_;
    name_ = other.name_;
    version_ = other.version_;
    _intern = std::move(intern);
}

// --- groups --------------------------------------------------------------------------------------

int32_t Configuration::addGroup(const FastString& groupName) {
    if (groupName.empty()) {
        assertion(__LINE__, "!groupName.empty()");
        return -1;
    }
    _intern->_groups.push_back(groupName);
    _intern->_groupsPropertyLists.emplace_back();
    return static_cast<int32_t>(_intern->_groups.size() - 1);
}

int32_t Configuration::getGroupIndex(const FastString& groupName) const {
    if (groupName.empty()) return -1;
    int32_t found = -1;
    const auto& groups = _intern->_groups;
    for (size_t i = 0; i < groups.size(); ++i) {
        if (groups[i] != groupName) continue;
        if (found >= 0) return -2;
        found = static_cast<int32_t>(i);
    }
    return found;
}

FastString Configuration::getGroupName(int32_t groupIndex) const {
    if (!_intern->listAt(groupIndex, __LINE__)) return {};
    return _intern->_groups[static_cast<size_t>(groupIndex)];
}

std::vector<FastString> Configuration::getGroupNames() const { return _intern->_groups; }

bool Configuration::removeGroup(const FastString& groupName) { return removeGroup(getGroupIndex(groupName)); }

bool Configuration::removeGroup(int32_t groupIndex) {
    if (groupIndex < 0 || static_cast<size_t>(groupIndex) >= _intern->_groups.size()) return false;
    _intern->_groups.erase(_intern->_groups.begin() + groupIndex);
    _intern->_groupsPropertyLists.erase(_intern->_groupsPropertyLists.begin() + groupIndex);
    return true;
}

void Configuration::clearAll() {
    _intern->_groups.clear();
    _intern->_groupsPropertyLists.clear();
}

// --- properties ----------------------------------------------------------------------------------

template <class T>
bool Configuration::setTyped(const FastString& group, const FastString& property, T&& value, bool createGroup) {
    int32_t index = getGroupIndex(group);
    if (index == -1 && createGroup) index = addGroup(group);
    return _intern->setAny(index, property, boost::any(std::forward<T>(value)), __LINE__);
}

template <class T>
T Configuration::getTyped(int32_t groupIndex, const FastString& property, const T& defaultValue) const {
    const PropertyMap* list = _intern->listAt(groupIndex, __LINE__);
    if (!list) return defaultValue;
    const auto it = list->find(property);
    if (it != list->end())
        if (const T* held = boost::any_cast<T>(&it->second)) return *held;
    assertion(__LINE__, "boost::any_cast<T>(&value) != nullptr");
    warn(__LINE__, text::formatMessage("Couldn't convert (boost::any_cast) the property '%1' to %2.",
                                       {property.view(), detail::PropertyType<T>::cppName}));
    return defaultValue;
}

#define VEK_CONFIGURATION_SETTERS(ParamType, StoredType)                                                          \
    bool Configuration::setProperty(const FastString& group, const FastString& property, ParamType value,        \
                                    bool createGroup) {                                                           \
        return setTyped(group, property, StoredType(value), createGroup);                                         \
    }                                                                                                             \
    bool Configuration::setProperty(int32_t groupIndex, const FastString& property, ParamType value) {            \
        return _intern->setAny(groupIndex, property, boost::any(StoredType(value)), __LINE__);                    \
    }

VEK_CONFIGURATION_SETTERS(const FastString&, FastString)
VEK_CONFIGURATION_SETTERS(const char*, FastString)
VEK_CONFIGURATION_SETTERS(const FloatArray&, FloatArray)
VEK_CONFIGURATION_SETTERS(const StringArray&, StringArray)
VEK_CONFIGURATION_SETTERS(Timestamp, Timestamp)
VEK_CONFIGURATION_SETTERS(int32_t, int32_t)
VEK_CONFIGURATION_SETTERS(uint32_t, uint32_t)
VEK_CONFIGURATION_SETTERS(long, long)
VEK_CONFIGURATION_SETTERS(float, float)
VEK_CONFIGURATION_SETTERS(double, double)
VEK_CONFIGURATION_SETTERS(bool, bool)
#undef VEK_CONFIGURATION_SETTERS

#define VEK_CONFIGURATION_GETTERS(Name, Type, ParamType)                                                          \
    Type Configuration::Name(const FastString& group, const FastString& property, ParamType defaultValue) const { \
        return getTyped<Type>(getGroupIndex(group), property, defaultValue);                                      \
    }                                                                                                             \
    Type Configuration::Name(int32_t groupIndex, const FastString& property, ParamType defaultValue) const {      \
        return getTyped<Type>(groupIndex, property, defaultValue);                                                \
    }

VEK_CONFIGURATION_GETTERS(getPropertyAsInt, int32_t, int32_t)
VEK_CONFIGURATION_GETTERS(getPropertyAsUnsignedInt, uint32_t, uint32_t)
VEK_CONFIGURATION_GETTERS(getPropertyAsLong, long, long)
VEK_CONFIGURATION_GETTERS(getPropertyAsFloat, float, float)
VEK_CONFIGURATION_GETTERS(getPropertyAsDouble, double, double)
VEK_CONFIGURATION_GETTERS(getPropertyAsBool, bool, bool)
VEK_CONFIGURATION_GETTERS(getPropertyAsString, FastString, const FastString&)
VEK_CONFIGURATION_GETTERS(getPropertyAsFloatArray, Configuration::FloatArray, const FloatArray&)
VEK_CONFIGURATION_GETTERS(getPropertyAsStringArray, Configuration::StringArray, const StringArray&)
VEK_CONFIGURATION_GETTERS(getPropertyAsTimestamp, Configuration::Timestamp, Timestamp)
#undef VEK_CONFIGURATION_GETTERS

bool Configuration::hasProperty(const FastString& group, const FastString& property) const {
    return hasProperty(getGroupIndex(group), property);
}

bool Configuration::hasProperty(int32_t groupIndex, const FastString& property) const {
    if (groupIndex < 0 || static_cast<size_t>(groupIndex) >= _intern->_groupsPropertyLists.size()) return false;
    return _intern->_groupsPropertyLists[static_cast<size_t>(groupIndex)].contains(property);
}

std::vector<FastString> Configuration::getPropertyNames(const FastString& group) const {
    return getPropertyNames(getGroupIndex(group));
}

std::vector<FastString> Configuration::getPropertyNames(int32_t groupIndex) const {
    std::vector<FastString> names;
    if (const PropertyMap* list = _intern->listAt(groupIndex, __LINE__))
        for (const auto& entry : *list) names.push_back(entry.first);
    return names;
}

bool Configuration::removeProperty(const FastString& group, const FastString& property) {
    return removeProperty(getGroupIndex(group), property);
}

bool Configuration::removeProperty(int32_t groupIndex, const FastString& property) {
    PropertyMap* list = _intern->listAt(groupIndex, __LINE__);
    return list && list->erase(property) > 0;
}

FastString Configuration::getConfigurationFileName() const { return fileName_; }
FastString Configuration::getConfigurationName() const { return name_; }
FastString Configuration::getConfigurationVersion() const { return version_; }

// --- XML -----------------------------------------------------------------------------------------

void Configuration::serializeInternal(XmlElement node) {
    if (!version_.empty()) node.setAttribute("version", version_);
    for (size_t g = 0; g < _intern->_groups.size(); ++g) {
        XmlElement group = node.appendChild("group");
        group.setAttribute("name", _intern->_groups[g]);
        for (const auto& [name, value] : _intern->_groupsPropertyLists[g]) {
            XmlElement key = group.appendChild("key");
            key.setAttribute("name", name);
            writeValue(detail::PropertyTypes{}, key, value);
        }
    }
}

void Configuration::deserializeInternal(XmlElement node) {
    if (const auto version = node.attribute("version")) version_ = FastString(*version);
    for (XmlElement groupElement = node.firstChild(); groupElement; groupElement = groupElement.nextSibling()) {
        if (!FastString(groupElement.name()).equalsIgnoreAsciiCase("group")) continue;
        const auto groupName = groupElement.attribute("name");
        if (!groupName) parseFailure(__LINE__, kGroupWithoutName);
        const int32_t groupIndex = addGroup(FastString(*groupName));
        for (XmlElement key = groupElement.firstChild(); key; key = key.nextSibling()) {
            const auto name = key.attribute("name");
            const auto type = key.attribute("type");
            if (!name || !type) parseFailure(__LINE__, kPropertyWithoutAttributes);
            // An empty value (a failed conversion) is refused here, and reading goes on.
            _intern->setAny(groupIndex, FastString(*name), readValue(key, *type), __LINE__);
        }
    }
}

bool Configuration::loadGuarded(XmlElement root, bool nameFromAttribute) {
    try {
        auto snapshot = std::make_unique<Snapshot>(Snapshot{fileName_, name_, version_, *_intern});
        try {
            clearAll();
            if (!nameFromAttribute)
                name_ = FastString(root.name());
            else if (const auto name = root.attribute("name"))
                name_ = FastString(*name);
            deserializeInternal(root);
            return true;
        } catch (const std::exception& e) {
            clearAll();
            fileName_ = std::move(snapshot->fileName);
            name_ = std::move(snapshot->name);
            version_ = std::move(snapshot->version);
            *_intern = std::move(snapshot->intern);
            warn(__LINE__, text::formatMessage("Error while parsing configuration XML document! Error was '%*'.", {e.what()}));
            return false;
        }
    } catch (const std::exception& e) {  // no memory for the snapshot: nothing was changed
        warn(__LINE__, text::formatMessage("Error while parsing configuration XML document! Error was '%*'.", {e.what()}));
        return false;
    }
}

bool Configuration::loadFromXMLDoc(const std::shared_ptr<xml::XmlDocumentRapid>& document) {
    if (!document || !document->root()) return false;
    return loadGuarded(document->root(), false);
}

bool Configuration::deserialize(const FastString& xmlText) {
    std::string error;
    const auto document = xml::XmlDocumentRapid::fromText(xmlText, &error);
    if (!document) debug::log(Level::Debug, kSource, __LINE__, error);
    return loadFromXMLDoc(document);
}

bool Configuration::deserialize(XmlElement element) {
    if (!element) return false;
    return loadGuarded(element, true);
}

bool Configuration::loadFromFile(const FastString& path) {
    try {
        std::string error;
        const auto document = xml::XmlDocumentRapid::fromFile(filesystem::pathFromUtf8(path), &error);
        if (!document) debug::log(Level::Debug, kSource, __LINE__, error);
        if (document && loadFromXMLDoc(document)) {
            fileName_ = path;
            return true;
        }
        warn(__LINE__, text::formatMessage("Could not load configuration XML file '%*'!", {path.view()}));
    } catch (const std::exception& e) {
        warn(__LINE__, text::formatMessage("Could not load configuration XML file '%1'! Exception was %2",
                                           {path.view(), e.what()}));
    }
    return false;
}

std::shared_ptr<xml::XmlDocumentRapid> Configuration::createXMLDoc() {
    try {
        auto document = std::make_shared<xml::XmlDocumentRapid>();
        // A name that is no XML name (it can come from a foreign element's attribute) would
        // make a file that no longer loads.
        std::string_view rootName = name_.view();
        if (!xml::isValidXmlName(rootName)) {
            warn(__LINE__, text::formatMessage("The configuration name '%1' is not a valid XML element name; "
                                               "writing 'configuration' instead.",
                                               {rootName}));
            rootName = "configuration";
        }
        serializeInternal(document->createRoot(rootName));
        return document;
    } catch (const std::exception& e) {
        warn(__LINE__, text::formatMessage("Could not create the configuration XML document! Exception was %1", {e.what()}));
        return nullptr;
    }
}

FastString Configuration::serialize() {
    const auto document = createXMLDoc();
    if (!document) return {};
    try {
        return FastString(document->toText());
    } catch (const std::exception&) {
        return {};
    }
}

void Configuration::serialize(XmlElement element) {
    if (!element) return;
    try {
        element.setAttribute("name", name_);
        serializeInternal(element);
    } catch (const std::exception& e) {
        warn(__LINE__, text::formatMessage("Could not create the configuration XML document! Exception was %1", {e.what()}));
    }
}

bool Configuration::writeToFile(bool flag) {
    try {
        if (fileName_.empty()) throw ConfigurationException("no file name");
        const auto document = createXMLDoc();
        if (!document) return false;
        document->save(filesystem::pathFromUtf8(fileName_), flag);
        return true;
    } catch (const std::exception& e) {
        warn(__LINE__, text::formatMessage("Could not save configuration XML file '%1'! Exception was %2",
                                           {fileName_.view(), e.what()}));
        return false;
    }
}

bool Configuration::writeToFile(const FastString& path, bool flag) {
    if (path.empty()) return writeToFile(flag);
    FastString previous = std::exchange(fileName_, path);
    if (writeToFile(flag)) return true;
    fileName_ = std::move(previous);
    return false;
}

}  // namespace vek::plugin_common

// A store of settings: an ordered list of named groups (names may repeat), each a map of
// named, typed properties. It is loaded from and saved to XML files, turned into XML text and
// back, or written into an element of another document. It never throws to its callers: a
// failed load or save returns false, a missing or mistyped property the caller's default, and
// each such event is logged.
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "lib/text/FastString.h"
#include "lib/time/Timestamp.h"
#include "lib/xml/XmlElement.h"

namespace vek::xml {
class XmlDocumentRapid;
}

namespace vek::plugin_common {

class Configuration {
public:
    using FastString = text::FastString;
    using Timestamp = time::Timestamp;
    using FloatArray = std::vector<float>;
    using StringArray = std::vector<FastString>;

    Configuration();
    explicit Configuration(const FastString& fileName);
    // Copies another store's file name, name, version and content; a null pointer leaves it empty.
    explicit Configuration(const std::shared_ptr<const Configuration>& other);
    Configuration(const Configuration&) = delete;
    Configuration& operator=(const Configuration&) = delete;
    virtual ~Configuration();

    // Groups.
    int32_t addGroup(const FastString& groupName);
    // -1 when no group or the empty name is asked for, -2 when several groups share the name.
    int32_t getGroupIndex(const FastString& groupName) const;
    FastString getGroupName(int32_t groupIndex) const;
    std::vector<FastString> getGroupNames() const;
    bool removeGroup(const FastString& groupName);
    bool removeGroup(int32_t groupIndex);
    virtual void clearAll();  // keeps name, version and file name

    // Setters: the by-name form creates a missing group when createGroup is true.
    bool setProperty(const FastString& group, const FastString& property, const FastString& value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, const char* value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, const FloatArray& value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, const StringArray& value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, Timestamp value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, int32_t value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, uint32_t value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, long value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, float value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, double value, bool createGroup = true);
    bool setProperty(const FastString& group, const FastString& property, bool value, bool createGroup = true);

    bool setProperty(int32_t groupIndex, const FastString& property, const FastString& value);
    bool setProperty(int32_t groupIndex, const FastString& property, const char* value);
    bool setProperty(int32_t groupIndex, const FastString& property, const FloatArray& value);
    bool setProperty(int32_t groupIndex, const FastString& property, const StringArray& value);
    bool setProperty(int32_t groupIndex, const FastString& property, Timestamp value);
    bool setProperty(int32_t groupIndex, const FastString& property, int32_t value);
    bool setProperty(int32_t groupIndex, const FastString& property, uint32_t value);
    bool setProperty(int32_t groupIndex, const FastString& property, long value);
    bool setProperty(int32_t groupIndex, const FastString& property, float value);
    bool setProperty(int32_t groupIndex, const FastString& property, double value);
    bool setProperty(int32_t groupIndex, const FastString& property, bool value);

    // Getters: the stored value when it holds exactly the asked type, else the default (no
    // conversion between types; the miss is logged).
    int32_t getPropertyAsInt(const FastString& group, const FastString& property, int32_t defaultValue = 0) const;
    uint32_t getPropertyAsUnsignedInt(const FastString& group, const FastString& property, uint32_t defaultValue = 0) const;
    long getPropertyAsLong(const FastString& group, const FastString& property, long defaultValue = 0) const;
    float getPropertyAsFloat(const FastString& group, const FastString& property, float defaultValue = 0) const;
    double getPropertyAsDouble(const FastString& group, const FastString& property, double defaultValue = 0) const;
    bool getPropertyAsBool(const FastString& group, const FastString& property, bool defaultValue = false) const;
    FastString getPropertyAsString(const FastString& group, const FastString& property, const FastString& defaultValue = {}) const;
    FloatArray getPropertyAsFloatArray(const FastString& group, const FastString& property, const FloatArray& defaultValue = {}) const;
    StringArray getPropertyAsStringArray(const FastString& group, const FastString& property, const StringArray& defaultValue = {}) const;
    Timestamp getPropertyAsTimestamp(const FastString& group, const FastString& property, Timestamp defaultValue = {}) const;

    int32_t getPropertyAsInt(int32_t groupIndex, const FastString& property, int32_t defaultValue = 0) const;
    uint32_t getPropertyAsUnsignedInt(int32_t groupIndex, const FastString& property, uint32_t defaultValue = 0) const;
    long getPropertyAsLong(int32_t groupIndex, const FastString& property, long defaultValue = 0) const;
    float getPropertyAsFloat(int32_t groupIndex, const FastString& property, float defaultValue = 0) const;
    double getPropertyAsDouble(int32_t groupIndex, const FastString& property, double defaultValue = 0) const;
    bool getPropertyAsBool(int32_t groupIndex, const FastString& property, bool defaultValue = false) const;
    FastString getPropertyAsString(int32_t groupIndex, const FastString& property, const FastString& defaultValue = {}) const;
    FloatArray getPropertyAsFloatArray(int32_t groupIndex, const FastString& property, const FloatArray& defaultValue = {}) const;
    StringArray getPropertyAsStringArray(int32_t groupIndex, const FastString& property, const StringArray& defaultValue = {}) const;
    Timestamp getPropertyAsTimestamp(int32_t groupIndex, const FastString& property, Timestamp defaultValue = {}) const;

    bool hasProperty(const FastString& group, const FastString& property) const;
    bool hasProperty(int32_t groupIndex, const FastString& property) const;
    // In map order: byte by byte, bytes compared as signed values, a prefix first.
    std::vector<FastString> getPropertyNames(const FastString& group) const;
    std::vector<FastString> getPropertyNames(int32_t groupIndex) const;
    bool removeProperty(const FastString& group, const FastString& property);
    bool removeProperty(int32_t groupIndex, const FastString& property);

    FastString getConfigurationFileName() const;
    FastString getConfigurationName() const;
    FastString getConfigurationVersion() const;

    // Loading replaces the whole content; on failure the store stays exactly as it was.
    virtual bool loadFromFile(const FastString& path);
    bool loadFromXMLDoc(const std::shared_ptr<xml::XmlDocumentRapid>& document);
    bool deserialize(const FastString& xmlText);
    bool deserialize(xml::XmlElement element);  // "name" attribute and content of a foreign element

    // Saving: `flag` creates missing parent folders. The file is replaced crash-safely.
    virtual bool writeToFile(bool flag);
    // Saves under a new path; the file name changes only if the save succeeds.
    virtual bool writeToFile(const FastString& path, bool flag);
    virtual std::shared_ptr<xml::XmlDocumentRapid> createXMLDoc();  // nullptr if none could be made
    virtual FastString serialize();                                  // empty if no document could be made
    void serialize(xml::XmlElement element);                         // "name" attribute and content

protected:
    virtual void copyContent(const Configuration& other);
    virtual void serializeInternal(xml::XmlElement node);
    virtual void deserializeInternal(xml::XmlElement node);  // throws ConfigurationException

private:
    struct Intern;
    struct Snapshot;
    template <class T>
    bool setTyped(const FastString& group, const FastString& property, T&& value, bool createGroup);
    template <class T>
    T getTyped(int32_t groupIndex, const FastString& property, const T& defaultValue) const;
    bool loadGuarded(xml::XmlElement root, bool nameFromAttribute);

    FastString fileName_;
    FastString name_;
    FastString version_;
    std::unique_ptr<Intern> _intern;
};

}  // namespace vek::plugin_common

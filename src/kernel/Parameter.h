// Watched fields of a stage: each parameter compares its field byte by byte with a snapshot to detect
// changes, and the serialised ones read and write themselves as text entries "name value".
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace VEK_STD {

// Numbers the unnamed serialised parameters ("Parameter" + number) during one read or write pass.
// Module-wide and unguarded: the host calls us from one thread.
extern int32_t parameterCounter;

class cAbstractParameter {
public:
    virtual ~cAbstractParameter() = default;
    // Deletes p; a null p is allowed.
    static void Delete(cAbstractParameter* p) { delete p; }
    virtual bool HasChanged() const = 0;
    virtual void AcceptChanges() = 0;
    virtual bool Watches(const void* address) const = 0;
    // Reads from `cursor` on in a zero-terminated text; never reads past the terminator.
    virtual void Read(const char* text, const char*& cursor, int32_t& counter) = 0;
    // Writes at `cursor` into buffer[0, capacity); an entry that would not fit (with the terminating
    // zero) is dropped whole. The text stays zero-terminated.
    virtual void Write(char* buffer, size_t capacity, char*& cursor, int32_t& counter) = 0;
    // Upper bound of what Write appends, terminator not included.
    virtual size_t TextLength() const = 0;
};

// Watches `size` raw bytes.
class cParameter : public cAbstractParameter {
public:
    cParameter(void* target, uint32_t size, bool serialised, const char* name = nullptr);
    bool HasChanged() const override;
    void AcceptChanges() override;
    bool Watches(const void* address) const override { return address == target; }
    void Read(const char* text, const char*& cursor, int32_t& counter) override;
    void Write(char* buffer, size_t capacity, char*& cursor, int32_t& counter) override;
    size_t TextLength() const override;

    bool IsSerialised() const { return serialised; }
    uint32_t Size() const { return size; }

protected:
    // The entry name: the given one, or "Parameter" + counter.
    std::string EntryName(int32_t counter) const;
    size_t NameLengthBound() const;

    const char escape = '\\';
    const char quote = '"';
    const char zeroEscape = '0';
    const uint8_t escaped = 0;
    bool serialised;
    const char* name;
    void* target;
    void* owner = nullptr;
    uint32_t size;
    std::unique_ptr<uint8_t[]> snapshot;
};

// Watches one int32; its text value is a signed decimal.
class cIntParameter : public cParameter {
public:
    cIntParameter(int32_t* field, bool serialised, const char* name = nullptr);
    void Read(const char* text, const char*& cursor, int32_t& counter) override;
    void Write(char* buffer, size_t capacity, char*& cursor, int32_t& counter) override;
    size_t TextLength() const override;

private:
    int32_t* field;
};

// An ordered, owning list of parameters; operations run over the members in order.
class cParameterSet : public cAbstractParameter {
public:
    cParameterSet() = default;
    ~cParameterSet() override;
    cParameterSet(const cParameterSet&) = delete;
    cParameterSet& operator=(const cParameterSet&) = delete;

    // Takes ownership.
    void Add(cAbstractParameter* parameter);
    size_t Count() const { return members.size(); }

    bool HasChanged() const override;
    void AcceptChanges() override;
    bool Watches(const void* address) const override;
    void Read(const char* text, const char*& cursor, int32_t& counter) override;
    void Write(char* buffer, size_t capacity, char*& cursor, int32_t& counter) override;
    size_t TextLength() const override;
    // A zeroed buffer of TextLength() + 1 bytes holding the written text.
    std::unique_ptr<char[]> WriteToNewBuffer(int32_t& counter);

private:
    std::vector<cAbstractParameter*> members;
};

}  // namespace VEK_STD

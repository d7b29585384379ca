// Scripting descriptors. A descriptor is a host handle holding a flat list of items, each
// {uint32 key, uint32 type, uint32 length, bytes}; integers are 4 native-endian bytes, text is
// stored without terminator.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "Memory.h"
#include "hostapi/HostInterface.h"

namespace noctiva::host {

struct DescriptorItem {
    pi::uint32 key = 0;
    pi::uint32 type = 0;
    std::int32_t integer = 0;
    std::string text;
};

// Builds a host-owned descriptor handle; null when the handle cannot be allocated.
pi::Handle makeDescriptor(HandleTable& handles, const std::vector<DescriptorItem>& items);
// Null for a handle we do not know or whose content is not a descriptor.
std::optional<std::vector<DescriptorItem>> readDescriptor(const HandleTable& handles, pi::Handle h);

struct ReadToken {
    std::vector<DescriptorItem> items;
    std::size_t next = 0;     // item getKey returns next
    std::size_t current = 0;  // item the getX calls read (valid once getKey returned true)
    bool started = false;
    pi::uint32* keyArray = nullptr;
    pi::OSErr sticky = pi::noErr;
};

struct WriteToken {
    std::vector<DescriptorItem> items;
};

// Open tokens; a token left open at the end of a run is a leak.
class DescriptorTokens {
public:
    pi::PIReadDescriptor openRead(std::vector<DescriptorItem> items, pi::uint32* keyArray);
    ReadToken* read(pi::PIReadDescriptor t);
    std::unique_ptr<ReadToken> closeRead(pi::PIReadDescriptor t);
    pi::PIWriteDescriptor openWrite();
    WriteToken* write(pi::PIWriteDescriptor t);
    std::unique_ptr<WriteToken> closeWrite(pi::PIWriteDescriptor t);

    int openReads() const { return int(reads_.size()); }
    int openWrites() const { return int(writes_.size()); }
    void clear() {
        reads_.clear();
        writes_.clear();
    }

private:
    std::unordered_map<pi::PIReadDescriptor, std::unique_ptr<ReadToken>> reads_;
    std::unordered_map<pi::PIWriteDescriptor, std::unique_ptr<WriteToken>> writes_;
};

}  // namespace noctiva::host

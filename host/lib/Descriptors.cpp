#include "Descriptors.h"

#include <cstring>

namespace noctiva::host {

namespace {
void putU32(std::string& out, std::uint32_t v) { out.append(reinterpret_cast<const char*>(&v), 4); }

bool getU32(const char*& p, const char* end, std::uint32_t& v) {
    if (end - p < 4) return false;
    std::memcpy(&v, p, 4);
    p += 4;
    return true;
}
}  // namespace

pi::Handle makeDescriptor(HandleTable& handles, const std::vector<DescriptorItem>& items) {
    std::string bytes;
    for (const auto& item : items) {
        putU32(bytes, item.key);
        putU32(bytes, item.type);
        if (item.type == pi::typeInteger) {
            putU32(bytes, 4);
            putU32(bytes, std::uint32_t(item.integer));
        } else {
            putU32(bytes, std::uint32_t(item.text.size()));
            bytes += item.text;
        }
    }
    if (bytes.size() > std::size_t(INT32_MAX)) return nullptr;
    pi::Handle h = handles.allocate(std::int32_t(bytes.size()), /*hostOwned=*/true);
    if (h) std::memcpy(*h, bytes.data(), bytes.size());
    return h;
}

std::optional<std::vector<DescriptorItem>> readDescriptor(const HandleTable& handles, pi::Handle h) {
    if (!h || !handles.contains(h)) return std::nullopt;
    const char* p = *h;
    const char* end = p + handles.size(h);
    std::vector<DescriptorItem> items;
    while (p < end) {
        DescriptorItem item;
        std::uint32_t length = 0;
        if (!getU32(p, end, item.key) || !getU32(p, end, item.type) || !getU32(p, end, length) ||
            std::size_t(end - p) < length)
            return std::nullopt;
        if (item.type == pi::typeInteger) {
            if (length != 4) return std::nullopt;
            std::uint32_t v = 0;
            getU32(p, end, v);
            item.integer = std::int32_t(v);
        } else {
            item.text.assign(p, length);
            p += length;
        }
        items.push_back(std::move(item));
    }
    return items;
}

pi::PIReadDescriptor DescriptorTokens::openRead(std::vector<DescriptorItem> items, pi::uint32* keyArray) {
    auto token = std::make_unique<ReadToken>();
    token->items = std::move(items);
    token->keyArray = keyArray;
    auto key = reinterpret_cast<pi::PIReadDescriptor>(token.get());
    reads_.emplace(key, std::move(token));
    return key;
}

ReadToken* DescriptorTokens::read(pi::PIReadDescriptor t) {
    auto it = reads_.find(t);
    return it == reads_.end() ? nullptr : it->second.get();
}

std::unique_ptr<ReadToken> DescriptorTokens::closeRead(pi::PIReadDescriptor t) {
    auto it = reads_.find(t);
    if (it == reads_.end()) return nullptr;
    auto token = std::move(it->second);
    reads_.erase(it);
    return token;
}

pi::PIWriteDescriptor DescriptorTokens::openWrite() {
    auto token = std::make_unique<WriteToken>();
    auto key = reinterpret_cast<pi::PIWriteDescriptor>(token.get());
    writes_.emplace(key, std::move(token));
    return key;
}

WriteToken* DescriptorTokens::write(pi::PIWriteDescriptor t) {
    auto it = writes_.find(t);
    return it == writes_.end() ? nullptr : it->second.get();
}

std::unique_ptr<WriteToken> DescriptorTokens::closeWrite(pi::PIWriteDescriptor t) {
    auto it = writes_.find(t);
    if (it == writes_.end()) return nullptr;
    auto token = std::move(it->second);
    writes_.erase(it);
    return token;
}

}  // namespace noctiva::host

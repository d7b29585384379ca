// The ten value types a configuration property can hold: their type names in the XML file,
// the names the warnings use, and their text forms. One table serves writing and reading.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "lib/text/FastString.h"
#include "lib/text/Number.h"
#include "lib/time/Timestamp.h"

namespace vek::plugin_common::detail {

template <class... Ts>
struct TypeList {};

template <class T>
struct PropertyType;

template <class T>
struct NumericText {
    static constexpr bool isArray = false;
    static std::string toText(T v) { return text::formatNumber(v); }
    static T fromText(std::string_view s) { return text::parseNumberOrThrow<T>(s); }
};

template <>
struct PropertyType<int32_t> : NumericText<int32_t> {
    static constexpr std::string_view xmlName = "int";
    static constexpr std::string_view cppName = "int";
};

template <>
struct PropertyType<uint32_t> : NumericText<uint32_t> {
    static constexpr std::string_view xmlName = "unsigned int";
    static constexpr std::string_view cppName = "unsigned int";
    // The whole unsigned range; a negative 32-bit text (older writers) wraps as it always did.
    static uint32_t fromText(std::string_view s) {
        const auto v = text::parseNumberOrThrow<int64_t>(s);
        if (v < INT32_MIN || v > UINT32_MAX) throw text::NumberFormatException("out of range: " + std::string(s));
        return static_cast<uint32_t>(v);
    }
};

template <>
struct PropertyType<long> : NumericText<long> {
    static constexpr std::string_view xmlName = "long";
    static constexpr std::string_view cppName = "long";
};

template <>
struct PropertyType<float> : NumericText<float> {
    static constexpr std::string_view xmlName = "float";
    static constexpr std::string_view cppName = "float";
};

template <>
struct PropertyType<double> : NumericText<double> {
    static constexpr std::string_view xmlName = "double";
    static constexpr std::string_view cppName = "double";
};

template <>
struct PropertyType<bool> {
    static constexpr bool isArray = false;
    static constexpr std::string_view xmlName = "bool";
    static constexpr std::string_view cppName = "bool";
    static std::string toText(bool v) { return v ? "1" : "0"; }
    static bool fromText(std::string_view s) {
        if (const auto v = text::parseBool(s)) return *v;
        throw text::NumberFormatException("not a truth value: " + std::string(s));
    }
};

template <>
struct PropertyType<text::FastString> {
    static constexpr bool isArray = false;
    static constexpr std::string_view xmlName = "string";
    static constexpr std::string_view cppName = "vek::utf8string";
    static std::string toText(const text::FastString& v) { return v.str(); }
    static text::FastString fromText(std::string_view s) { return text::FastString(s); }
};

template <>
struct PropertyType<time::Timestamp> {
    static constexpr bool isArray = false;
    static constexpr std::string_view xmlName = "timestamp";
    static constexpr std::string_view cppName = "Timestamp";
    static std::string toText(time::Timestamp v) { return text::formatNumber(v.secondsSinceEpoch()); }
    // All 64 bits: a 32-bit read would corrupt every time from 2038 on.
    static time::Timestamp fromText(std::string_view s) {
        return time::Timestamp::fromSecondsSinceEpoch(text::parseNumberOrThrow<int64_t>(s));
    }
};

template <class Element>
struct ArrayType {
    static constexpr bool isArray = true;
    using ElementType = PropertyType<Element>;
};

template <>
struct PropertyType<std::vector<float>> : ArrayType<float> {
    static constexpr std::string_view xmlName = "float_array";
    static constexpr std::string_view cppName = "std::vector<float>";
    static constexpr std::string_view elementTag = "float";
};

template <>
struct PropertyType<std::vector<text::FastString>> : ArrayType<text::FastString> {
    static constexpr std::string_view xmlName = "string_array";
    static constexpr std::string_view cppName = "std::vector<vek::utf8string>";
    static constexpr std::string_view elementTag = "string";
};

using PropertyTypes = TypeList<text::FastString, std::vector<float>, std::vector<text::FastString>, time::Timestamp,
                               int32_t, uint32_t, long, float, double, bool>;

}  // namespace vek::plugin_common::detail

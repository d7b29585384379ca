// What a filter module declares about itself in its PIPL and AETE resources, read from the module
// file without loading or running it, the way an image editor learns about its plug-ins.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "hostapi/HostInterface.h"
#include "noctiva/host/Error.h"

namespace noctiva::host {

// The expression language of the 'enbl' property: integers, true/false, the mode words
// ("RGBMode", "Gray16Mode", ...), the variables PSHOP_ImageMode and PSHOP_ImageDepth, the
// comparisons == != < <= > >=, ! && ||, parentheses and `in (value, candidate, ...)`.
// An unknown name is a parse error: guessing its value could enable a filter on images it
// cannot handle.
class EnableExpression {
public:
    // Throws std::invalid_argument with the reason and the character position.
    static EnableExpression parse(std::string_view text);

    bool evaluate(pi::int16 imageMode, int depth) const;
    const std::string& text() const { return text_; }

    struct Node {
        enum class Kind { Number, ImageMode, ImageDepth, Not, And, Or, Compare, In } kind;
        std::int64_t value = 0;    // Number: the value; Compare: the operator
        std::vector<int> operands;  // indexes into nodes_
    };

private:
    std::int64_t eval(int node, pi::int16 imageMode, int depth) const;

    std::string text_;
    std::vector<Node> nodes_;
    int root_ = -1;
};

// The mode number of a mode word ("RGBMode" -> 3), or nullopt.
std::optional<pi::int16> modeFromWord(std::string_view word);
// "RGB 8-bit", "Gray 16-bit", "Bitmap", ...: an image mode as the user knows it.
std::string modeDescription(pi::int16 imageMode, int depth);
// The bits per channel a mode implies (1 for Bitmap, 8, 16 or 32).
int naturalDepth(pi::int16 imageMode);

struct FilterCaseInfo {
    std::uint8_t inputHandling = 0;
    std::uint8_t outputHandling = 0;
    std::uint8_t flags1 = 0;
    std::uint8_t flags2 = 0;
};

struct Terminology {
    std::int32_t version = 0;
    std::uint32_t classId = 0;
    std::uint32_t eventId = 0;
    pi::int16 terminologyId = 0;  // the AETE resource that describes the event
    std::string scope;            // empty: visible to the host's scripting language
};

struct AeteParameter {
    std::string name;
    std::uint32_t key = 0;
    std::uint32_t type = 0;
    std::string description;
    std::uint16_t flags = 0;
};

struct AeteEvent {
    std::string suiteName;
    std::uint32_t suiteId = 0;
    std::string name;
    std::string description;
    std::uint32_t eventClass = 0;
    std::uint32_t eventId = 0;
    std::uint32_t replyType = 0;
    std::uint32_t directParameterType = 0;
    std::uint16_t directParameterFlags = 0;
    std::vector<AeteParameter> parameters;
};

struct ModuleInfo {
    std::uint32_t kind = 0;  // '8BFM' for a filter
    std::string name;        // menu title, "Noctiva..."
    std::string category;    // "**Hidden**" keeps it out of the menus
    int versionMajor = 0, versionMinor = 0;  // interface version the module needs
    std::string entryPoint;                  // the x86-64 entry symbol ('8664')
    std::vector<std::uint8_t> modeFlags;     // 'mode' data bytes; empty when absent
    std::optional<EnableExpression> enable;  // 'enbl'
    std::optional<std::uint8_t> filterLayer;  // 'flly' first byte
    std::optional<std::array<FilterCaseInfo, 7>> filterCases;  // 'fici', cases 1..7
    std::optional<Terminology> terminology;  // 'hstm'
    std::optional<AeteEvent> event;          // the AETE event the terminology names

    bool hidden() const { return category == "**Hidden**"; }
    bool supportsFilterLayers() const { return filterLayer && (*filterLayer & 0x80) != 0; }
    // The 'mode' flag of an image mode, regardless of 'enbl'.
    bool modeFlagged(pi::int16 imageMode) const;
    // 'enbl' decides when present, else the 'mode' flags.
    bool supportsMode(pi::int16 imageMode, int depth) const;
    // Every mode with its natural depth the module accepts, for messages: "RGB 8-bit, RGB 16-bit".
    std::vector<std::string> supportedModes() const;
    std::string supportedModesText() const;
};

// Reads the "PIPL" and "AETE" sections of a 64-bit little-endian ELF module. Throws
// HostError(path, reason) when the file is not such a module, has no PIPL, or declares something
// this host cannot run (not a filter, interface newer than 4.0, no entry point).
ModuleInfo readModuleInfo(const std::filesystem::path& path);

// The same from resource bytes already in memory; `subject` names them in errors.
ModuleInfo parseModuleResources(const std::string& subject, std::span<const std::uint8_t> pipl,
                                std::optional<std::span<const std::uint8_t>> aete);

// Nullopt when the module accepts images of this mode and depth; otherwise the refusal, named
// after the module: "Noctiva...: this filter does not support Gray 8-bit images (it supports
// RGB 8-bit, RGB 16-bit)".
std::optional<HostError> checkImageSupported(const ModuleInfo& info, pi::int16 imageMode, int depth);

}  // namespace noctiva::host

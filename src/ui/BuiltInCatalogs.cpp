#include "BuiltInCatalogData.inc"
#include "ui/Localization.h"

namespace {

template <size_t N>
std::string join(const std::string_view (&pieces)[N]) {
    std::string text;
    for (std::string_view piece : pieces) text.append(piece);
    return text;
}

}  // namespace

std::string BuiltInCatalog(std::string_view prefix) {
    if (prefix == "@Quell2") return join(kQuell2Pieces);
    if (prefix == "@CommonCtrl") return join(kCommonCtrlPieces);
    return {};
}

#include "ui/Localization.h"

#ifdef _WIN32
#include <windows.h>
#else
#include <dlfcn.h>
#endif

#include <exception>
#include <fstream>
#include <iterator>
#include <system_error>
#include <utility>
#include <vector>

#include "config/SettingsConfigFile.h"
#include "lib/text/Utf.h"
#include "ui/DOM.h"

namespace fs = std::filesystem;

namespace {

std::unique_ptr<TextCatalog> gCatalog;

std::string lowerAscii(std::string_view text) {
    std::string lower(text);
    for (char& c : lower)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return lower;
}

std::vector<std::string_view> split(std::string_view text, char separator) {
    std::vector<std::string_view> parts;
    size_t begin = 0;
    for (;;) {
        const size_t end = text.find(separator, begin);
        parts.push_back(text.substr(begin, end == std::string_view::npos ? std::string_view::npos : end - begin));
        if (end == std::string_view::npos) break;
        begin = end + 1;
    }
    return parts;
}

// Adds the `language` entries of one `key` subtree. Walked with an explicit stack: catalogue files
// are not trusted to nest shallowly.
void collectTexts(const GUI_Common::DOMElement& root, std::string_view prefix, TextCatalog& catalog) {
    struct Frame {
        const GUI_Common::DOMElement* element;
        size_t next;        // index of the next child to visit
        size_t pathLength;  // length of the key path before this element's name was appended
    };
    std::string path(prefix);
    std::vector<Frame> stack;
    stack.push_back({&root, 0, path.size()});
    while (!stack.empty()) {
        Frame& frame = stack.back();
        const auto& children = frame.element->children();
        if (frame.next == children.size()) {
            path.resize(frame.pathLength);
            stack.pop_back();
            continue;
        }
        const GUI_Common::DOMNode& node = *children[frame.next++];
        if (node.nodeType() != GUI_Common::DOMNode::ELEMENT_NODE) continue;
        const auto& child = static_cast<const GUI_Common::DOMElement&>(node);
        const bool insideKey = stack.size() > 1;
        if (child.name() == "key") {
            const size_t before = path.size();
            path += '.';
            if (const std::string* name = child.attribute("name")) path += *name;
            stack.push_back({&child, 0, before});  // invalidates `frame`
        } else if (child.name() == "language" && insideKey) {
            const std::string* region = child.attribute("regioncode");
            if (region != nullptr && lowerAscii(*region) == catalog.regionCode()) catalog.add(path, child.text());
        }
    }
}

std::string textFrom(const fs::path& file, bool& ok) {
    std::ifstream in(file, std::ios::binary);
    ok = static_cast<bool>(in);
    if (!ok) return {};
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

}  // namespace

std::string Language::regionCode() const { return lowerAscii(language + ":" + country); }

std::wstring_view LanguageTable() {
    return L"en-GB:en-GB:en:gb:en-GB;en:en:en:us:en;de:de:de:de:de;es:es:es:es:es;it:it:it:it:it;"
           L"fr:fr:fr:fr:fr;pt_BR:pt_BR:pt:br:pt;pt:pt:pt:br:pt;ja:ja:ja:jp:ja;zh-CN:zh-CN:zh:cn:zh-CN;"
           L"zh-TW:zh-TW:zh:tw:zh-TW;nl:nl:nl:nl:nl;pl:pl:pl:pl:pl;ru:ru:ru:ru:ru;th:th:th:th:th;"
           L"tr:tr:tr:tr:tr;ko:kr:ko:kr:kr;es-419:es-419:es:419:es-419";
}

Language ChooseLanguage(std::string_view configured, std::string_view secondConfigured) {
    const std::string table = vek::text::wideToUtf8(LanguageTable());
    std::vector<std::vector<std::string_view>> rows;
    for (std::string_view entry : split(table, ';')) {
        std::vector<std::string_view> fields = split(entry, ':');
        bool complete = fields.size() >= 5;
        for (std::string_view f : fields) complete = complete && !f.empty();
        if (complete) rows.push_back(std::move(fields));
    }
    auto pick = [](const std::vector<std::string_view>& f) {
        return Language{std::string(f[2]), std::string(f[3]), std::string(f[4])};
    };
    for (const auto& f : rows)
        if (f[0] == configured && f[1] == secondConfigured) return pick(f);
    for (const auto& f : rows)
        if (f[0] == configured) return pick(f);
    return Language{};
}

Language ConfiguredLanguage() {
    std::string configured = "en";
    std::string second = "en";
    try {
        vek::SettingsConfigFile settings;
        configured = settings.getPropertyAsString("Language", "Language", "en").str();
        second = settings.getPropertyAsString("Language", "Language", "en").str();
    } catch (const std::exception&) {
        configured = second = "en";
    }
    return ChooseLanguage(configured, second);
}

TextCatalog::TextCatalog(Language language) : language_(std::move(language)), regionCode_(language_.regionCode()) {}

bool TextCatalog::add(std::string_view key, std::string text) {
    return texts_.try_emplace(lowerAscii(key), std::move(text)).second;
}

const std::string* TextCatalog::find(std::string_view key) const {
    const auto it = texts_.find(lowerAscii(key));
    return it == texts_.end() ? nullptr : &it->second;
}

TextCatalog* TextCatalog::current() noexcept { return gCatalog.get(); }

void CreateCatalog(const Language& language) {
    if (!gCatalog) gCatalog = std::make_unique<TextCatalog>(language);
}

void LoadCatalogText(std::string_view text, std::string_view prefix) {
    if (!gCatalog) CreateCatalog(ConfiguredLanguage());
    const std::unique_ptr<GUI_Common::DOMElement> root = GUI_Common::ParseDocument(text);
    if (!root || root->name() != "localization") return;
    collectTexts(*root, prefix, *gCatalog);
}

bool LoadCatalogFile(const fs::path& file, std::string_view prefix) {
    std::error_code ec;
    if (!fs::is_regular_file(file, ec)) return false;
    bool ok = false;
    const std::string text = textFrom(file, ok);
    if (!ok) return false;
    // A byte-order mark or any other lead-in before the document is not part of it.
    const size_t start = text.find('<');
    LoadCatalogText(start == std::string::npos ? std::string_view{} : std::string_view(text).substr(start), prefix);
    return true;
}

void LoadLocalization(const fs::path& baseFolder) {
    if (!gCatalog) CreateCatalog(ConfiguredLanguage());
    // operator/ joins with the platform's own separator (a backslash on Windows).
    const fs::path loc = baseFolder / "loc";
    LoadCatalogFile(loc / "Quell2.loc", "@Quell2");
    LoadCatalogFile(loc / "CommonCtrl.loc", "@CommonCtrl");
    LoadCatalogText(BuiltInCatalog("@Quell2"), "@Quell2");
    LoadCatalogText(BuiltInCatalog("@CommonCtrl"), "@CommonCtrl");
}

std::wstring Translate(std::string_view key) {
    if (!gCatalog) {
        const size_t dot = key.rfind('.');
        return vek::text::utf8ToWide(dot == std::string_view::npos ? key : key.substr(dot + 1));
    }
    // "@'" keys take a lookup of their own that this module never needs; they stay as written.
    if (key.size() >= 1 && key[0] == '@' && (key.size() < 2 || key[1] != '\'')) {
        const std::string* found = gCatalog->find(key);
        if (found != nullptr && !found->empty()) {
            std::string text;
            text.reserve(found->size());
            for (size_t i = 0; i < found->size(); ++i) {
                if ((*found)[i] == '\\' && i + 1 < found->size() && (*found)[i + 1] == 'n') {
                    text.push_back('\n');
                    ++i;
                } else {
                    text.push_back((*found)[i]);
                }
            }
            return vek::text::utf8ToWide(text);
        }
    }
    return vek::text::utf8ToWide(key);
}

void ReleaseLocalization() { gCatalog.reset(); }

namespace {

// The file that holds this function, as the loader names it; empty if it cannot say.
fs::path moduleFile() {
#ifdef _WIN32
    HMODULE module = nullptr;
    if (!GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT,
                            reinterpret_cast<LPCWSTR>(&moduleFile), &module))
        return {};
    // The name is cut short, not failed, when the buffer is too small: grow until it fits.
    std::wstring name(MAX_PATH, L'\0');
    for (;;) {
        const DWORD length = GetModuleFileNameW(module, name.data(), DWORD(name.size()));
        if (length == 0) return {};
        if (length < name.size()) {
            name.resize(length);
            return fs::path(name);
        }
        if (name.size() >= 32768) return {};  // longer than any Windows path
        name.resize(name.size() * 2);
    }
#else
    Dl_info info{};
    if (dladdr(reinterpret_cast<const void*>(&moduleFile), &info) == 0 || info.dli_fname == nullptr) return {};
    return fs::path(info.dli_fname);
#endif
}

}  // namespace

fs::path ModuleFolder() {
    // The catalogue files are installed beside the module, and the module is the one thing whose
    // place is known whatever host loaded it: ask the loader which file holds this function.
    const fs::path named = moduleFile();
    if (named.empty()) return {};
    std::error_code ec;
    fs::path file = fs::weakly_canonical(named, ec);
    if (ec) file = named;
    return file.parent_path();
}

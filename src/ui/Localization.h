// Localised texts. Every text a person sees is named by a catalogue key such as
// "@Quell2.WarningsErrors.TitleWarning" and looked up in the process-wide catalogue, which holds the
// texts of one region (language ":" country, lower case) gathered from catalogue files and from the
// catalogues compiled into the module.
#pragma once

#include <cstddef>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <string_view>

struct Language {
    std::string language = "en";
    std::string country = "us";
    std::string catalogCode = "en";

    // "en:us": what a catalogue entry's regioncode must equal, in lower case.
    std::string regionCode() const;
};

// The table of configured codes: entries at ";", five fields at ":" (configured code, second
// configured code, language, country, catalogue code).
std::wstring_view LanguageTable();

// The row whose first two fields match both codes, else the first whose first field matches the
// configured code, else en/us.
Language ChooseLanguage(std::string_view configured, std::string_view secondConfigured);

// The language the user chose in the settings file; English when it cannot be read.
Language ConfiguredLanguage();

class TextCatalog {
public:
    explicit TextCatalog(Language language);

    const Language& language() const noexcept { return language_; }
    const std::string& regionCode() const noexcept { return regionCode_; }

    // Keys are kept in lower case. The first text stored for a key stays; false when it was
    // already there.
    bool add(std::string_view key, std::string text);
    // Null when the key is absent; the key is compared without regard to case.
    const std::string* find(std::string_view key) const;
    size_t size() const noexcept { return texts_.size(); }

    // The process's catalogue, null before the first start-up and after a release.
    static TextCatalog* current() noexcept;

private:
    Language language_;
    std::string regionCode_;
    std::map<std::string, std::string, std::less<>> texts_;
};

// Creates the catalogue (choosing the language from the settings file) unless one exists; then
// adds "loc/Quell2.loc" and "loc/CommonCtrl.loc" under `baseFolder`, then the compiled-in
// catalogues, so a file's text wins over the built-in one.
void LoadLocalization(const std::filesystem::path& baseFolder);

// Creates the catalogue with this language unless one exists (the language of an existing one
// stays).
void CreateCatalog(const Language& language);

// Parses one catalogue document and adds its texts for the current region under `prefix`.
// A malformed document is reported on standard error and adds nothing.
void LoadCatalogText(std::string_view text, std::string_view prefix);

// Reads a catalogue file and passes it, from its first "<", to LoadCatalogText. A missing file is
// skipped; false when nothing was read.
bool LoadCatalogFile(const std::filesystem::path& file, std::string_view prefix);

// The text for a key. Without a catalogue: the part after the key's last "."; a key missing from
// the catalogue, or not starting with "@", comes back as it is.
std::wstring Translate(std::string_view key);

// Destroys the catalogue; the next start-up chooses the language again.
void ReleaseLocalization();

// The compiled-in catalogue texts (their pieces joined).
std::string BuiltInCatalog(std::string_view prefix);

// The folder holding the loaded module (the executable when the code is linked statically).
std::filesystem::path ModuleFolder();

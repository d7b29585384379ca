// The text catalogue: language choice, catalogue format, loading order and lookup.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <string>

#include "config/SettingsConfigFile.h"
#include "lib/TestFiles.h"
#include "ui/DOM.h"
#include "ui/Localization.h"

namespace {

std::string catalogue(std::string_view body) {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<localization>" + std::string(body) + "</localization>";
}

// A catalogue with one key "Title" whose texts are given as (regioncode, text) pairs.
std::string titleCatalogue(std::initializer_list<std::pair<std::string_view, std::string_view>> texts) {
    std::string body = "<key name=\"Dialog\"><key name=\"Title\">";
    for (const auto& [region, text] : texts)
        body += "<language regioncode=\"" + std::string(region) + "\">" + std::string(text) + "</language>";
    return catalogue(body + "</key></key>");
}

class CatalogTest : public ::testing::Test {
protected:
    void SetUp() override { ReleaseLocalization(); }
    void TearDown() override { ReleaseLocalization(); }

    vek::testing::TempDir temp;
    vek::testing::ScopedUserFolders folders{temp.path()};
};

TEST_F(CatalogTest, WithoutSettingsFileTheRegionIsEnUs) {
    LoadCatalogText(titleCatalogue({{"en:gb", "Colour"}, {"en:us", "Color"}}), "@T");
    ASSERT_NE(TextCatalog::current(), nullptr);
    EXPECT_EQ(TextCatalog::current()->regionCode(), "en:us");
    EXPECT_EQ(Translate("@T.Dialog.Title"), L"Color");
}

struct Choice {
    const char* configured;
    const char* second;
    const char* region;
    const char* catalogCode;
};

TEST(LanguageChoice, FollowsTheTable) {
    const Choice cases[] = {
        {"en", "en", "en:us", "en"},       {"en-GB", "en-GB", "en:gb", "en-GB"}, {"de", "de", "de:de", "de"},
        {"pt_BR", "pt_BR", "pt:br", "pt"}, {"pt", "pt", "pt:br", "pt"},          {"zh-TW", "zh-TW", "zh:tw", "zh-TW"},
        {"es-419", "es-419", "es:419", "es-419"},
        // "ko" is paired with "kr" in the table: only the fall-back on the first field finds it.
        {"ko", "ko", "ko:kr", "kr"},
        // The second code breaks the tie only; a mismatch falls back to the first field.
        {"de", "fr", "de:de", "de"},
        {"xx", "xx", "en:us", "en"},       {"", "", "en:us", "en"},              {"DE", "DE", "en:us", "en"},
    };
    for (const Choice& c : cases) {
        const Language language = ChooseLanguage(c.configured, c.second);
        EXPECT_EQ(language.regionCode(), c.region) << c.configured;
        EXPECT_EQ(language.catalogCode, c.catalogCode) << c.configured;
    }
}

// Catalogues loaded into an en:us catalogue (unless `language` is set): how many keys they add and
// what one key translates to.
TEST_F(CatalogTest, LoadingAndLookupRules) {
    struct Case {
        const char* what;
        std::string text;
        const char* prefix;
        size_t size;
        const char* key;
        const wchar_t* expected;
        const char* language = "en";
    };
    const Case cases[] = {
        {"region codes and keys without case", titleCatalogue({{"EN:US", "Title"}, {"DE:De", "Titel"}}), "@Quell2",
         1, "@qUELL2.dialog.TITLE", L"Titel", "de"},
        {"only a localization root", "<catalog><key name=\"A\"><language regioncode=\"en:us\">a</language></key></catalog>",
         "@T", 0, "@T.A", L"@T.A"},
        {"root name case", "<Localization><key name=\"A\"><language regioncode=\"en:us\">a</language></key></Localization>",
         "@T", 0, "@T.A", L"@T.A"},
        {"language outside a key, other elements",
         catalogue("<language regioncode=\"en:us\">stray</language>"
                   "<group><key name=\"Hidden\"><language regioncode=\"en:us\">h</language></key></group>"
                   "<key name=\"A\"><note><language regioncode=\"en:us\">n</language></note>"
                   "<language regioncode=\"en:us\">a</language></key>"),
         "@T", 1, "@T.A", L"a"},
        {"line breaks and tabs drop, spaces stay, \\n breaks",
         titleCatalogue({{"en:us", "  One\r\n\ttwo <!-- note --> three \\nfour\\\\n  "}}), "@T", 1, "@T.Dialog.Title",
         L"  Onetwo  three \nfour\\\n  "},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        ReleaseLocalization();
        CreateCatalog(ChooseLanguage(c.language, c.language));
        LoadCatalogText(c.text, c.prefix);
        EXPECT_EQ(TextCatalog::current()->size(), c.size);
        EXPECT_EQ(Translate(c.key), c.expected);
    }
}

TEST_F(CatalogTest, TextBeforeTheDeclarationIsSkipped) {
    vek::testing::writeFile(temp / "lead.loc", "\xEF\xBB\xBF garbage that is not XML\n" + titleCatalogue({{"en:us", "Hello"}}));
    CreateCatalog(Language{});
    ASSERT_TRUE(LoadCatalogFile(temp.path() / "lead.loc", "@T"));
    EXPECT_EQ(Translate("@T.Dialog.Title"), L"Hello");
    EXPECT_FALSE(LoadCatalogFile(temp.path() / "missing.loc", "@T"));
}

TEST_F(CatalogTest, KeysThatAreNotFoundComeBackAsTheyAre) {
    EXPECT_EQ(Translate("@Quell2.WarningsErrors.TitleWarning"), L"TitleWarning");  // no catalogue yet
    EXPECT_EQ(Translate("NoDotsHere"), L"NoDotsHere");
    CreateCatalog(Language{});
    LoadCatalogText(titleCatalogue({{"en:us", ""}, {"de:de", "Titel"}}), "@T");
    const char* unchanged[] = {"@Quell2.Missing.Key", "plain.text.with.dots", "@", "", "@'T.Dialog.Title",
                               "@T.Dialog.Title"};  // the last has an empty text in this region
    for (const char* key : unchanged) EXPECT_EQ(Translate(key), std::wstring(key, key + std::strlen(key))) << key;
}

TEST_F(CatalogTest, AFileBeatsTheBuiltInTextAndTheFirstDefinitionWins) {
    const std::string twice =
        catalogue("<key name=\"WarningsErrors\"><key name=\"TitleWarning\">"
                  "<language regioncode=\"en:us\">From the file</language></key>"
                  "<key name=\"TitleWarning\"><language regioncode=\"en:us\">Second definition</language></key></key>");
    vek::testing::writeFile(temp / "module/loc/Quell2.loc", twice);
    LoadLocalization(temp.path() / "module");
    EXPECT_EQ(Translate("@Quell2.WarningsErrors.TitleWarning"), L"From the file");
    // Keys the file does not have still come from the module.
    EXPECT_EQ(Translate("@Quell2.WarningsErrors.ErrorCreateLayer").substr(0, 9), L"The layer");
    EXPECT_EQ(Translate("@CommonCtrl.DialogButtons.Cancel.Label"), L"Cancel");
}

TEST_F(CatalogTest, ALaterStartUpKeepsTheLanguageAndOnlyAdds) {
    CreateCatalog(ChooseLanguage("fr", "fr"));
    LoadLocalization(temp.path());
    LoadLocalization(temp.path());
    EXPECT_EQ(TextCatalog::current()->regionCode(), "fr:fr");
    EXPECT_EQ(Translate("@CommonCtrl.DialogButtons.Cancel.Label"), L"Annuler");
    ReleaseLocalization();
    LoadLocalization(temp.path());  // chosen afresh from the (empty) settings
    EXPECT_EQ(Translate("@CommonCtrl.DialogButtons.Cancel.Label"), L"Cancel");
}

TEST_F(CatalogTest, BuiltInCataloguesHaveEveryTextInEveryLanguage) {
    const char* keys[] = {"@Quell2.WarningsErrors.TitleWarning",    "@Quell2.WarningsErrors.ErrorCreateLayer",
                          "@CommonCtrl.DialogButtons.OK.Label",     "@CommonCtrl.DialogButtons.Cancel.Label",
                          "@CommonCtrl.DialogButtons.Yes.Label",    "@CommonCtrl.DialogButtons.No.Label",
                          "@CommonCtrl.DialogButtons.NotAgain.Label"};
    for (const char* code : {"en", "en-GB", "de", "fr", "es", "it"}) {
        ReleaseLocalization();
        CreateCatalog(ChooseLanguage(code, code));
        LoadLocalization(temp.path());  // no files there: built-in texts only
        EXPECT_EQ(TextCatalog::current()->size(), std::size(keys)) << code;
        for (const char* key : keys) {
            const std::wstring text = Translate(key);
            EXPECT_FALSE(text.empty()) << code << ' ' << key;
            EXPECT_NE(text, std::wstring(key, key + std::strlen(key))) << code << ' ' << key;
        }
    }
    ReleaseLocalization();
    CreateCatalog(ChooseLanguage("de", "de"));
    LoadLocalization(temp.path());
    EXPECT_EQ(Translate("@Quell2.WarningsErrors.TitleWarning"), L"Warnung");
    EXPECT_NE(Translate("@Quell2.WarningsErrors.ErrorCreateLayer").find(L'\n'), std::wstring::npos);
}

TEST_F(CatalogTest, MalformedCataloguesReportOneLineAndAddNothing) {
    CreateCatalog(Language{});
    const std::string broken[] = {
        "<localization><key name=\"A\"><language regioncode=\"en:us\">a</key></localization>",
        "<localization><key name=\"A\">",
        "",
        "<localization/><second/>",
    };
    for (const std::string& text : broken) {
        testing::internal::CaptureStderr();
        LoadCatalogText(text, "@T");
        const std::string err = testing::internal::GetCapturedStderr();
        EXPECT_EQ(err.rfind("GUI_Common::DOMParser::parseData - parser error   :", 0), 0u) << err;
        EXPECT_NE(err.find(" - stopped at line:"), std::string::npos) << err;
        EXPECT_NE(err.find(" column:"), std::string::npos) << err;
        EXPECT_NE(err.find(" bytes:"), std::string::npos) << err;
        EXPECT_EQ(std::count(err.begin(), err.end(), '\n'), 1) << err;
    }
    EXPECT_EQ(TextCatalog::current()->size(), 0u);
}

TEST_F(CatalogTest, ACatalogueOfSeveralMegabytesLoads) {
    std::string body;
    constexpr int kKeys = 60000;
    for (int i = 0; i < kKeys; ++i) {
        const std::string n = std::to_string(i);
        body += "<key name=\"K" + n + "\"><language regioncode=\"de:de\">nein " + n +
                "</language><language regioncode=\"en:us\">Text number " + n + " with some padding</language></key>";
    }
    const std::string text = catalogue(body);
    ASSERT_GT(text.size(), 5u << 20);
    CreateCatalog(Language{});
    LoadCatalogText(text, "@Big");
    EXPECT_EQ(TextCatalog::current()->size(), static_cast<size_t>(kKeys));
    EXPECT_EQ(Translate("@Big.K0"), L"Text number 0 with some padding");
    EXPECT_EQ(Translate("@big.k59999"), L"Text number 59999 with some padding");
}

TEST_F(CatalogTest, DeeplyNestedKeysLoadWithoutExhaustingTheStack) {
    constexpr int kDepth = 300000;
    std::string text = "<localization>";
    text.reserve(kDepth * 24);
    for (int i = 0; i < kDepth; ++i) text += "<key name=\"k\">";
    text += "<language regioncode=\"en:us\">deep</language>";
    for (int i = 0; i < kDepth; ++i) text += "</key>";
    text += "</localization>";
    CreateCatalog(Language{});
    LoadCatalogText(text, "@D");
    std::string key = "@D";
    for (int i = 0; i < kDepth; ++i) key += ".k";
    EXPECT_EQ(Translate(key), L"deep");

    // The same depth left open: the partial tree is thrown away, also without recursion.
    testing::internal::CaptureStderr();
    LoadCatalogText(text.substr(0, text.size() / 3), "@E");
    EXPECT_NE(testing::internal::GetCapturedStderr().find("parser error"), std::string::npos);
    EXPECT_EQ(TextCatalog::current()->size(), 1u);
}

TEST(DOMParser, KeepsAttributesChildrenAndJoinedText) {
    const auto root = GUI_Common::ParseDocument("<r a=\"1\" b='two'>x<c/>y<!-- z --><d>\n</d>w</r>");
    ASSERT_TRUE(root);
    EXPECT_EQ(root->name(), "r");
    ASSERT_EQ(root->attributes().size(), 2u);
    EXPECT_EQ(*root->attribute("b"), "two");
    EXPECT_EQ(root->attribute("c"), nullptr);
    EXPECT_EQ(root->text(), "xyw");
    ASSERT_EQ(root->children().size(), 2u);
    EXPECT_EQ(root->children()[1]->parent(), root.get());
}

TEST(ModuleFolder, IsTheFolderOfTheFileHoldingTheCode) {
    const auto folder = ModuleFolder();
    ASSERT_FALSE(folder.empty());
    EXPECT_TRUE(std::filesystem::is_directory(folder));
    EXPECT_TRUE(folder.is_absolute());
}

}  // namespace

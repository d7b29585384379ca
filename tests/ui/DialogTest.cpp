// The message dialog and the warning logic, in this process, on a private X server.
#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <memory>

#include <wx/button.h>
#include <wx/checkbox.h>
#include <wx/config.h>
#include <wx/stattext.h>
#include <wx/toplevel.h>

#include "Processes.h"
#include "lib/TestFiles.h"
#include "ui/App.h"
#include "ui/ErrorReport.h"
#include "ui/Localization.h"
#include "ui/MessageDialog.h"

namespace {

XvfbServer* gServer = nullptr;

class DisplayEnvironment : public ::testing::Environment {
public:
    void SetUp() override {
        server_ = std::make_unique<XvfbServer>();
        gServer = server_.get();
        if (!server_->display().empty()) setenv("DISPLAY", server_->display().c_str(), 1);
        setenv("NO_AT_BRIDGE", "1", 1);
    }

private:
    // Stopped only when the process ends, after the tests: the toolkit keeps its connection for good.
    static inline std::unique_ptr<XvfbServer> server_;
};

const auto* const kEnvironment = ::testing::AddGlobalTestEnvironment(new DisplayEnvironment);

class DialogTest : public ::testing::Test {
protected:
    void SetUp() override {
        if (gServer == nullptr || gServer->display().empty()) GTEST_SKIP() << "Xvfb could not be started";
        ASSERT_TRUE(StartToolkit());
        ReleaseLocalization();
        CreateCatalog(Language{});
        LoadLocalization(temp.path());
    }
    void TearDown() override { ReleaseLocalization(); }

    vek::testing::TempDir temp;
    vek::testing::ScopedUserFolders folders{temp.path()};
};

std::vector<wxButton*> buttonsOf(const DialogButtonPanel& panel) {
    std::vector<wxButton*> buttons;
    for (wxWindow* child : panel.GetChildren())
        if (auto* button = dynamic_cast<wxButton*>(child)) buttons.push_back(button);
    return buttons;
}

struct KindCase {
    int kind;
    std::vector<std::pair<int, const char*>> buttons;  // id, English label
    bool notAgain;
};

TEST_F(DialogTest, EachKindHasItsButtonsInPanelOrder) {
    const KindCase cases[] = {
        {0, {{wxID_OK, "OK"}}, false},
        {1, {{wxID_OK, "OK"}}, true},
        {2, {{wxID_OK, "OK"}, {wxID_CANCEL, "Cancel"}}, false},
        {3, {{wxID_OK, "OK"}, {wxID_CANCEL, "Cancel"}}, true},
        {4, {{wxID_NO, "No"}, {wxID_YES, "Yes"}}, false},
        {5, {{wxID_NO, "No"}, {wxID_YES, "Yes"}}, true},
        {6, {{wxID_YES, "OK"}, {wxID_CANCEL, "Cancel"}}, false},
        {7, {}, false},
        {-1, {}, false},
    };
    for (const KindCase& c : cases) {
        MessageDialog dialog(nullptr, "Title", "The message", c.kind);
        const auto buttons = buttonsOf(*dialog.ButtonPanel());
        ASSERT_EQ(buttons.size(), c.buttons.size()) << "kind " << c.kind;
        for (size_t i = 0; i < buttons.size(); ++i) {
            EXPECT_EQ(buttons[i]->GetId(), c.buttons[i].first) << "kind " << c.kind;
            EXPECT_EQ(buttons[i]->GetLabel(), c.buttons[i].second) << "kind " << c.kind;
        }
        ASSERT_EQ(dialog.ButtonPanel()->NotAgainBox() != nullptr, c.notAgain) << "kind " << c.kind;
        if (c.notAgain) {
            EXPECT_EQ(dialog.ButtonPanel()->NotAgainBox()->GetLabel(), "Don't show this message again");
        }
        auto* text = dynamic_cast<wxStaticText*>(wxWindow::FindWindowByName("staticText", &dialog));
        ASSERT_NE(text, nullptr);
        EXPECT_EQ(text->GetLabel(), "The message");
        EXPECT_EQ(dialog.GetTitle(), "Title");
        EXPECT_EQ(dialog.GetBackgroundColour(), wxColour(233, 233, 233));
    }
}

// Ends the next dialog from inside its modal loop, as a click would.
void endNextDialog(bool tick, int buttonId, std::function<void(MessageDialog&)> inspect = {}) {
    wxTheApp->CallAfter([=] {
        for (wxWindow* window : wxTopLevelWindows) {
            auto* dialog = dynamic_cast<MessageDialog*>(window);
            if (dialog == nullptr || !dialog->IsModal()) continue;
            if (inspect) inspect(*dialog);
            if (tick && dialog->ButtonPanel()->NotAgainBox()) dialog->ButtonPanel()->NotAgainBox()->SetValue(true);
            wxWindow* button = dialog->FindWindow(buttonId);
            if (button == nullptr) {
                dialog->Close();
                return;
            }
            wxCommandEvent click(wxEVT_BUTTON, buttonId);
            click.SetEventObject(button);
            button->ProcessWindowEvent(click);
            return;
        }
    });
}

TEST_F(DialogTest, ATickedBoxEndsTheDialogWith5113WhateverWasPressed) {
    struct Case {
        int kind;
        int button;
        bool tick;
        int result;
    } cases[] = {
        {1, wxID_OK, false, wxID_OK},     {1, wxID_OK, true, kNotAgainResult},
        {3, wxID_CANCEL, false, wxID_CANCEL}, {3, wxID_CANCEL, true, kNotAgainResult},
        {4, wxID_YES, false, wxID_YES},   {4, wxID_NO, false, wxID_NO},
        {5, wxID_NO, true, kNotAgainResult}, {6, wxID_YES, false, wxID_YES},
        {1, wxID_ANY, true, kNotAgainResult},  // closed without a button
    };
    for (const Case& c : cases) {
        MessageDialog dialog(nullptr, "Title", "Message", c.kind);
        endNextDialog(c.tick, c.button);
        EXPECT_EQ(dialog.ShowModal(), c.result) << "kind " << c.kind << " button " << c.button;
    }
}

// A tick remembered and the next run silent, and no tick leaving the settings alone, are checked
// through the host in ReportEndToEnd; here the cases a run cannot reach.
TEST_F(DialogTest, ShowWarningRemembersOnlyATick) {
    DialogSettingsStore store;
    wxConfigBase* settings = wxConfigBase::Get(false);
    ASSERT_EQ(settings, store.Get());

    // An empty key: kind 0, nothing written even with a result of 5113 impossible to get.
    int kind = -1;
    endNextDialog(false, wxID_OK, [&](MessageDialog& d) { kind = d.Kind(); });
    EXPECT_EQ(ShowWarning(nullptr, "Message", ""), wxID_OK);
    EXPECT_EQ(kind, 0);
    EXPECT_EQ(settings->GetNumberOfEntries(), 0u);

    // An explicit true is left alone; a tick then turns it off.
    settings->Write("ShowSomething", true);
    endNextDialog(false, wxID_OK, [&](MessageDialog& d) { kind = d.Kind(); });
    EXPECT_EQ(ShowWarning(nullptr, "Message", "ShowSomething"), wxID_OK);
    EXPECT_EQ(kind, 1);
    EXPECT_TRUE(settings->ReadBool("ShowSomething", false));
    endNextDialog(true, wxID_OK);
    EXPECT_EQ(ShowWarning(nullptr, "Message", "ShowSomething"), kNotAgainResult);
    EXPECT_EQ(ShowWarning(nullptr, "Message", "ShowSomething"), 0);
}

TEST_F(DialogTest, ChoicesUnderTheFormerStoreNameCarryOverOnce) {
    const auto former = DialogSettingsStore::FilePath().parent_path() / "Quell 2.conf";
    vek::testing::writeFile(former, "ShowErrorCreateLayer=0\n[Dialogs]\nSize=12\n");
    {
        DialogSettingsStore store;
        EXPECT_FALSE(store.Get()->ReadBool("ShowErrorCreateLayer", true));
        EXPECT_EQ(store.Get()->ReadLong("/Dialogs/Size", 0), 12);
        store.Get()->Write("ShowErrorCreateLayer", true);
    }
    DialogSettingsStore again;  // exists now: nothing copied over again
    EXPECT_TRUE(again.Get()->ReadBool("ShowErrorCreateLayer", false));
}

TEST_F(DialogTest, TheReportRunsTwiceInOneProcessAndReleasesTheCatalogue) {
    ReleaseLocalization();
    // A handle that names no window: the dialog goes without a parent instead of failing.
    pi::PlatformData platform{};
    platform.hwnd = 0x7fffff01;
    pi::FilterRecord record{};
    record.platformData = &platform;
    for (pi::FilterRecord* r : {&record, static_cast<pi::FilterRecord*>(nullptr)}) {
        wxString title;
        int kind = -1;
        endNextDialog(false, wxID_OK, [&](MessageDialog& d) {
            title = d.GetTitle();
            kind = d.Kind();
        });
        ReportCreateLayerError(r);
        EXPECT_EQ(title, "Warning");
        EXPECT_EQ(kind, 1);
        EXPECT_EQ(TextCatalog::current(), nullptr);
        EXPECT_EQ(wxConfigBase::Get(false), nullptr);
    }
}

}  // namespace

#include "Dialog.h"

#include <gtk/gtk.h>

#include <string>

#include "Presets.h"

namespace noctiva::gimp {

namespace {

constexpr const char* kCustom = "";  // combo id of "custom settings text"

struct Widgets {
    GtkComboBoxText* combo = nullptr;
    GtkLabel* summary = nullptr;
    GtkTextBuffer* text = nullptr;
    bool filling = false;  // the text is being set from a preset, not edited
};

std::string bufferText(GtkTextBuffer* buffer) {
    GtkTextIter start, end;
    gtk_text_buffer_get_bounds(buffer, &start, &end);
    gchar* raw = gtk_text_buffer_get_text(buffer, &start, &end, FALSE);
    std::string text(raw);
    g_free(raw);
    return text;
}

void onPresetChanged(GtkComboBox* combo, gpointer data) {
    auto* w = static_cast<Widgets*>(data);
    const gchar* id = gtk_combo_box_get_active_id(combo);
    const noctiva::cli::Preset* preset = id ? noctiva::cli::findPreset(id) : nullptr;
    gtk_label_set_text(w->summary, preset ? preset->summary : "the settings text below, as written");
    if (preset == nullptr) return;
    w->filling = true;
    const std::string text = noctiva::cli::presetSettingsText(*preset);
    gtk_text_buffer_set_text(w->text, text.c_str(), -1);
    w->filling = false;
}

void onTextChanged(GtkTextBuffer*, gpointer data) {
    auto* w = static_cast<Widgets*>(data);
    if (!w->filling) gtk_combo_box_set_active_id(GTK_COMBO_BOX(w->combo), kCustom);
}

// A pasted text often carries a line break at the end or blanks in front of the signature.
std::string tidy(std::string text) {
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
    const std::size_t first = text.find_first_not_of(" \t\r\n");
    return first == std::string::npos ? std::string() : text.substr(first);
}

}  // namespace

std::optional<Choice> runDialog(const Choice& initial) {
    if (!gtk_init_check(nullptr, nullptr)) throw std::runtime_error("cannot open the display for the dialog");

    GtkWidget* dialog = gtk_dialog_new_with_buttons("Noctiva", nullptr, GTK_DIALOG_MODAL, "_Cancel",
                                                    GTK_RESPONSE_CANCEL, "_OK", GTK_RESPONSE_OK, nullptr);
    gtk_dialog_set_default_response(GTK_DIALOG(dialog), GTK_RESPONSE_OK);
    gtk_window_set_default_size(GTK_WINDOW(dialog), 560, 320);

    GtkWidget* grid = gtk_grid_new();
    gtk_grid_set_row_spacing(GTK_GRID(grid), 6);
    gtk_grid_set_column_spacing(GTK_GRID(grid), 8);
    gtk_container_set_border_width(GTK_CONTAINER(grid), 12);
    gtk_box_pack_start(GTK_BOX(gtk_dialog_get_content_area(GTK_DIALOG(dialog))), grid, TRUE, TRUE, 0);

    Widgets w;
    w.combo = GTK_COMBO_BOX_TEXT(gtk_combo_box_text_new());
    for (const auto& p : noctiva::cli::presets()) gtk_combo_box_text_append(w.combo, p.name, p.name);
    gtk_combo_box_text_append(w.combo, kCustom, "custom settings text");
    gtk_widget_set_hexpand(GTK_WIDGET(w.combo), TRUE);
    gtk_grid_attach(GTK_GRID(grid), gtk_label_new_with_mnemonic("_Preset:"), 0, 0, 1, 1);
    gtk_grid_attach(GTK_GRID(grid), GTK_WIDGET(w.combo), 1, 0, 1, 1);

    w.summary = GTK_LABEL(gtk_label_new(""));
    gtk_label_set_line_wrap(w.summary, TRUE);
    gtk_label_set_xalign(w.summary, 0.0f);
    gtk_grid_attach(GTK_GRID(grid), GTK_WIDGET(w.summary), 1, 1, 1, 1);

    GtkWidget* textView = gtk_text_view_new();
    gtk_text_view_set_wrap_mode(GTK_TEXT_VIEW(textView), GTK_WRAP_WORD_CHAR);
    gtk_text_view_set_monospace(GTK_TEXT_VIEW(textView), TRUE);
    w.text = gtk_text_view_get_buffer(GTK_TEXT_VIEW(textView));
    GtkWidget* scrolled = gtk_scrolled_window_new(nullptr, nullptr);
    gtk_scrolled_window_set_policy(GTK_SCROLLED_WINDOW(scrolled), GTK_POLICY_NEVER, GTK_POLICY_AUTOMATIC);
    gtk_widget_set_vexpand(scrolled, TRUE);
    gtk_container_add(GTK_CONTAINER(scrolled), textView);
    GtkWidget* textLabel = gtk_label_new("Settings text:");
    gtk_label_set_xalign(GTK_LABEL(textLabel), 0.0f);
    gtk_label_set_yalign(GTK_LABEL(textLabel), 0.0f);
    gtk_grid_attach(GTK_GRID(grid), textLabel, 0, 2, 1, 1);
    gtk_grid_attach(GTK_GRID(grid), scrolled, 1, 2, 1, 1);

    g_signal_connect(w.combo, "changed", G_CALLBACK(onPresetChanged), &w);
    g_signal_connect(w.text, "changed", G_CALLBACK(onTextChanged), &w);

    if (!initial.preset.empty() && noctiva::cli::findPreset(initial.preset)) {
        gtk_combo_box_set_active_id(GTK_COMBO_BOX(w.combo), initial.preset.c_str());
    } else if (!initial.settings.empty()) {
        gtk_text_buffer_set_text(w.text, initial.settings.c_str(), -1);  // switches the combo to custom
        gtk_combo_box_set_active_id(GTK_COMBO_BOX(w.combo), kCustom);
    } else {
        gtk_combo_box_set_active_id(GTK_COMBO_BOX(w.combo), "default");
    }

    gtk_widget_show_all(dialog);
    const gint response = gtk_dialog_run(GTK_DIALOG(dialog));

    std::optional<Choice> chosen;
    if (response == GTK_RESPONSE_OK) {
        const gchar* id = gtk_combo_box_get_active_id(GTK_COMBO_BOX(w.combo));
        Choice c;
        if (id != nullptr && *id != '\0')
            c.preset = id;
        else
            c.settings = tidy(bufferText(w.text));
        chosen = c;
    }
    gtk_widget_destroy(dialog);
    while (gtk_events_pending()) gtk_main_iteration();  // the dialog leaves the screen before the run
    return chosen;
}

}  // namespace noctiva::gimp

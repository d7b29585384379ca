// The toolkit inside a host that is not a toolkit program: started the first time a dialog is
// needed (never at module load, so loading cannot fail or block without a display) and kept for
// the life of the process.
#pragma once

#include <wx/app.h>

// The base of the product's application objects.
class vekApp : public wxApp {};

// Exists so the message dialog can run: names the application and succeeds.
class HiddenFilterApp : public vekApp {
public:
    bool OnInit() override;
};

// True when dialogs can be shown: the toolkit runs (started now if need be). False when no display
// can be opened; then it is not tried again in this process.
bool StartToolkit();

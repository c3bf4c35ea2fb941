// tavo xml check

#include "commands.h"
#include "document.h"
#include "progress.h"
#include "streams.h"

#include <algorithm>

namespace tool {

int Check(const CheckOptions& options) {
    Progress progress("checking", options.files.size());
    int worst = kFine;
    for (const std::string& file : options.files) {
        progress.Step(file);
        Document document;
        const int code = document.Open(file);
        if (code != kFileTrouble) {
            progress.Hide();
            Print(code == kFine ? document.Name() + ": fine\n" : document.Describe() + "\n");
        }
        if (code == kFine) document.NoteNamedReferences();
        worst = std::max(worst, code);
        if (worst != kFine && !options.keepGoing) break;
    }
    return worst;
}

} // namespace tool

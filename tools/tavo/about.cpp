// tavo about

#include "commands.h"
#include "streams.h"
#include "text.h"

#include <TAVO/core.h>
#include <TAVO/develop.h>

namespace tool {

int About() {
    using namespace TAVO::Core::OS;
    const auto line = [](const char* what, const std::string& text) {
        std::string label = what;
        label.resize(18, ' ');
        Print(label + text + '\n');
    };
    const auto fact = [&](const char* what, const wchar_t* text) { line(what, Shown(text, Pairs::Standard)); };
    const TAVO::Develop::tagSWITCHES switches = TAVO::Develop::GetSwitches();
    const auto onOff = [&](const char* what, bool on) { line(what, on ? "on" : "off"); };

    line("version", TAVO_VERSION);
    fact("platform", GetPlatformString());
    fact("process", GetProcessName());
    fact("startup path", GetStartupPath());
    onOff("AssertBox", switches.AssertBox);
    onOff("LogFailedHRESULT", switches.LogFailedHRESULT);
    onOff("BreakOnHRESULT", switches.BreakOnHRESULT);
    Print(
        "Platform and startup path are texts that hosts compare, the same on every system; no folder can be told from "
        "them.\n");
    Print("The switches stand in section [Debug] of the file TAVO.ini (libTAVO.ini on Linux) beside the library, and "
          "were "
          "read when it was loaded.\n");
    return kFine;
}

} // namespace tool

#pragma once

#include <string>
#include <vector>

#include "OxClasses/OxFileInfo.h"

// Sub-commands of the tool register themselves from their own source file, so that each
// one stays in one place. A command returns the process exit code.
using OxqelArgs = std::vector<std::string>;

struct OxqelCommand {
    const char* name;
    const char* usage;    // one line: arguments and options
    const char* summary;  // one line: what it does
    int (*run)(const OxqelArgs& args);
};

// The readers behind "oxqel dump FILE ...", chosen by the file's kind.
struct OxqelDumpFormat {
    const char* name;
    bool (*handles)(OxFileInfo::OxFileType type, const std::string& path);
    int (*run)(const OxqelArgs& args);  // args[0] is the file
};

struct OxqelRegistry {
    static std::vector<OxqelCommand>& commands();
    static std::vector<OxqelDumpFormat>& dumpFormats();
};

struct OxqelRegisterCommand {
    explicit OxqelRegisterCommand(const OxqelCommand& c) { OxqelRegistry::commands().push_back(c); }
};
struct OxqelRegisterDump {
    explicit OxqelRegisterDump(const OxqelDumpFormat& f) {
        OxqelRegistry::dumpFormats().push_back(f);
    }
};

// One clear line on standard error ("oxqel: ..."); returns the exit code for errors (1).
int oxqelFail(const std::string& message);
// True (and the option removed from args) when args holds the flag.
bool oxqelTakeFlag(OxqelArgs& args, const std::string& flag);
// The value after an option ("--log FILE"), removed with it; empty when absent.
std::string oxqelTakeOption(OxqelArgs& args, const std::string& option);

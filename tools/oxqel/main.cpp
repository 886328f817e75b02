#include <algorithm>
#include <cstdio>
#include <cstring>

#include "OxClasses/OxUtString.h"
#include "OxqelCommand.h"

std::vector<OxqelCommand>& OxqelRegistry::commands() {
    static std::vector<OxqelCommand> list;
    return list;
}

std::vector<OxqelDumpFormat>& OxqelRegistry::dumpFormats() {
    static std::vector<OxqelDumpFormat> list;
    return list;
}

int oxqelFail(const std::string& message) {
    std::fprintf(stderr, "oxqel: %s\n", message.c_str());
    return 1;
}

bool oxqelTakeFlag(OxqelArgs& args, const std::string& flag) {
    const auto it = std::find(args.begin(), args.end(), flag);
    if (it == args.end())
        return false;
    args.erase(it);
    return true;
}

std::string oxqelTakeOption(OxqelArgs& args, const std::string& option) {
    const auto it = std::find(args.begin(), args.end(), option);
    if (it == args.end() || it + 1 == args.end())
        return {};
    std::string value = *(it + 1);
    args.erase(it, it + 2);
    return value;
}

namespace {
void printUsage(FILE* to) {
    std::fprintf(to, "usage: oxqel COMMAND [ARGS]\n\ncommands:\n");
    auto commands = OxqelRegistry::commands();
    std::sort(commands.begin(), commands.end(), [](const OxqelCommand& a, const OxqelCommand& b) {
        return std::strcmp(a.name, b.name) < 0;
    });
    for (const auto& c : commands)
        std::fprintf(to, "  oxqel %s %s\n      %s\n", c.name, c.usage, c.summary);
}

int runDump(const OxqelArgs& args) {
    if (args.empty())
        return oxqelFail("dump: no file given");
    const std::string& path = args[0];
    // "--write OUT IN..." names no file to read: the workbook writer takes it.
    if (path == "--write")
        for (const auto& f : OxqelRegistry::dumpFormats())
            if (f.handles(OxFileInfo::FileMissing, path))
                return f.run(args);
    const auto type = OxFileInfo::_getFileType(OxUtString::LPCSTR_TO_LPCTSTR(path.c_str()));
    if (type == OxFileInfo::FileMissing)
        return oxqelFail("cannot read " + path);
    for (const auto& f : OxqelRegistry::dumpFormats())
        if (f.handles(type, path))
            return f.run(args);
    return oxqelFail(path + ": not a file kind that dump reads");
}

const OxqelRegisterCommand dump({"dump",
                                 "FILE [TABLE|SHEET] [--csv|--json|--schema] | --write OUT IN...",
                                 "lists the tables or sheets of a file, or prints one of them",
                                 runDump});
}  // namespace

int main(int argc, char** argv) {
    OxqelArgs args(argv + 1, argv + argc);
    const std::string name = args.empty() ? "demo" : args[0];
    if (name == "help" || name == "--help" || name == "-h") {
        printUsage(stdout);
        return 0;
    }
    if (!args.empty())
        args.erase(args.begin());
    for (const auto& c : OxqelRegistry::commands())
        if (name == c.name)
            return c.run(args);
    printUsage(stderr);
    return oxqelFail("unknown command: " + name);
}

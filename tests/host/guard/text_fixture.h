/// The guard of text outside ASCII, checked with the plug-in's own texts: what it makes of the
/// values on their way into a child or a file.
///
/// The plug-in's texts get their locale from the environment once in a process, so all cases of a
/// program have the same one.
#pragma once

#include <cstdlib>
#include <string>
#include <vector>

#include "base/zavstr.h"
#include "base/zavtoken.h"
#include "host/guard/guard_fixture.h"
#include "support/scoped_env.h"
#include "util/zavprocs.h"

inline std::string repeated(const std::string& letter, int count) {
    std::string text;
    for (int i = 0; i < count; ++i)
        text += letter;
    return text;
}

/// What a child or a system call gets of the text.
inline std::string narrowed(const ZAV::String& text) {
    return static_cast<const char*>(text.c_str());
}

/// The last argument of a command line.
inline std::string lastArgument(const ZAV::String& command) {
    char** argv = nullptr;
    const int count = ZAV::MakeArgv(&command, &argv);
    std::string last = count > 0 ? argv[count - 1] : "";
    for (int i = 0; i < count; ++i)
        ::free(argv[i]);
    ::free(argv);
    return last;
}

class TextGuard : public GuardTest {
protected:
    explicit TextGuard(const char* codePage = "UTF-8", const char* locale = "C.UTF-8")
        : GuardTest(codePage), locale_("LC_ALL", locale) {}

    std::string mended(const std::string& column, const std::string& value) {
        return admitted(given({{"COMMAND", "GETCONFIG"}, {column, value}})).value(column);
    }
    /// Checks what a translator gets on its standard input.
    void expectWholeContext(const std::string& text) {
        EXPECT_EQ(narrowed(mended("CONTEXT", text).c_str()), text);
    }
    void expectWholeMetafile(const std::string& name) {
        const ZAV::String value(mended("UACONFIG", name).c_str());
        EXPECT_EQ(narrowed("/depot/" + value), "/depot/" + name);
        EXPECT_EQ(lastArgument("/home/bin/um_console -h /home -c \"IMPORT /meta/" + value + "\""),
                  "IMPORT /meta/" + name);
        EXPECT_EQ(narrowed(value), name) << "in the row that answers";
    }
    void expectWholeScripts(const std::vector<std::string>& names) {
        std::string list;
        for (const std::string& name : names)
            list += (list.empty() ? "" : ",") + name;
        const ZAV::String value(mended("UASCRIPT", list).c_str());
        StringTokenizer tokens(value, ",");
        for (const std::string& name : names)
            EXPECT_EQ(narrowed("/depot/" + tokens.nextToken()), "/depot/" + name);
        EXPECT_FALSE(tokens.hasMoreTokens());
    }

private:
    ScopedEnv locale_;
};

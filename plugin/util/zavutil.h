/// What the library needs from the operating system: directories, files, commands.
///
/// All functions are static, may be called from any thread, and report failures by return values
/// and trace lines; the few that throw say so. Texts are converted to the local code page before
/// they reach the system (see String::c_str).
#pragma once

#include "base/zavstr.h"

namespace ZAV {

class Util {
public:
    Util() = delete;

    // ---- Directories and environment. All returned directories end with "/". --------------------

    /// Whether `path` names something that exists and can be reached.
    static bool pathExists(const String& path);

    /// The host's short name: what uname reports, up to the first ".".
    static String getHostName();

    /// The home directory that TOVRINHOME names. The first call that succeeds determines it and
    /// later calls return the same; after a failure the next call tries again. Returns false and
    /// empties `dir` when TOVRINHOME is not set or names nothing that exists.
    static bool getTovrinHomeDir(String& dir);

    /// The directory "config/" under TOVRINHOME; cached and reported in the same way.
    static bool getTovrinConfigDir(String& dir);

    /// The agent depot, the staging area of deployments: QVSDEPLOY_AGENTDEPOT, or the home
    /// directory when that is not set. Created when it does not exist. Cached and reported in the
    /// same way.
    static bool getAgentDepotDir(String& dir);

    /// Determines the home directory again; `dir` is empty on failure.
    static bool initTovrinHomeDir(String& dir);
    /// Determines the configuration directory again; `dir` is empty on failure.
    static bool initTovrinConfigDir(String& dir);
    /// Determines the agent depot again and creates it; `dir` is empty on failure.
    static bool initAgentDepotDir(String& dir);

    /// Creates the directory `path` and its missing parents, all with mode 0770 less the process's
    /// umask. Returns 0; 1 when `path` consists of nothing but "/"; 2 when out of memory; otherwise
    /// the errno value of the mkdir that failed. A directory that exists already gives EEXIST, so
    /// callers check pathExists first.
    static int createDir(const char* path);

    /// Finds where the central server of this home keeps its package depot. On entry `dir` is the
    /// home directory with a "/" at its end; on return it is the depot home, or with `addPackages`
    /// the directory of packages in it. With `create` a missing directory is created. Runs a
    /// command. Returns 0; 1 when the directory does not exist or cannot be created; 2 when the
    /// server's name cannot be determined, and then `dir` is unchanged.
    static int getDepotHome(String& dir, bool addPackages, bool create);

    // ---- Files ----------------------------------------------------------------------------------

    /// Reads a whole file. Returns 0 and sets `*buf` to a malloc'ed buffer with the bytes and a
    /// terminating 0, which the caller frees, or to null when the file is empty. On failure returns
    /// an errno value and sets `*buf` to null; a null path gives EINVAL.
    static int readFile(const char* path, char** buf);

    /// Removes a file. Returns false, and traces it, when that fails.
    static bool deleteFile(const String& path);

    /// Copies the file `src` into the directory `dstDir` under the same name. Returns 0, an errno
    /// value, or 5 when `src` has no "/" after its first character. Overwrites an existing file; a
    /// file copied onto itself ends up empty.
    static int copyFile(const String& src, const String& dstDir);

    /// Copies the file `src` to `dstDir`/`dstName`; returns 0 or an errno value.
    static int copyFile(const String& src, const String& dstDir, const String& dstName);

    /// Copies the file `src` to the file `dst`. Returns 0 or the errno value of the first step that
    /// failed. A copy that fails half way leaves what it has written so far.
    static int _copyFile(const String& src, const String& dst);

    /// Returns 0 when `path` is a directory, 1 when it is anything else that exists, 2 when it does
    /// not exist. Cleans `path` in place first: removes surrounding double quotes (with the blanks
    /// after a leading one) and trailing slashes and backslashes. "/" alone is cleaned to nothing.
    static int fso_test(char* path);

    /// Cuts `text` at its first carriage return, then at its first line feed. Throws
    /// IndexOutOfBoundsException when either search has no text: when `text` is empty or begins
    /// with a carriage return.
    static void stripNewlineCharsFromOutput(String& text);

    /// Finds a Java installation: the directory that the home's script bin/TovrinGetJavaHome
    /// prints, or else the one that JAVA_HOME or JAVAHOME names. `homeDir` has no "/" at its end.
    /// Leaves `javaHome` unchanged when nothing is found. Runs a command. Throws
    /// IndexOutOfBoundsException when a value begins with a carriage return.
    static void getJavaHome(const String& homeDir, String& javaHome);

    // ---- Commands -------------------------------------------------------------------------------

    /// Runs a command line and waits for its end. The line is split at blanks outside quotes (see
    /// MakeArgv); its first word is the path of an executable. The child reads `input` from its
    /// standard input, then end of file. With `nonBlocking`, once the child has ended, the rest of
    /// its output is read without waiting for more.
    ///
    /// Returns true when the child ended within the time-out (TIMEOUT in seconds, 300 by default):
    /// `rc` is its exit code, `stdOut` and `stdErr` are what it wrote. The exit code is 0 when the
    /// command could not be executed. Returns false when the child could not be started (the
    /// outputs are unchanged) or had to be killed (`stdOut` and `stdErr` hold what was read by
    /// then).
    static bool runCommand(const String& command, int& rc, String& stdOut, String& stdErr,
                           const String& input, bool nonBlocking);

    /// The same with additions to the child's environment: `env` is null or a list of "NAME=value"
    /// texts that ends in a null pointer. The caller keeps the list.
    static bool runCommandEnv(const String& command, char** env, int& rc, String& stdOut,
                              String& stdErr, const String& input, bool nonBlocking);

    // ---- Reserved columns -----------------------------------------------------------------------

    /// Splits a RESERVED column, such as "A=06.20.00:li6263;C=06.20.00:li6263;G=06.20.00:li6263",
    /// into the level and architecture of the agent (A), the version without dots and architecture
    /// of the shared component (C) and the version without dots of the common component (G).
    /// Returns false when the text is malformed; values before the fault have been stored by then.
    /// Outputs for which the text has no entry keep their values.
    static bool parseReserved(const String& reserved, String& agentLevel, String& agentArch,
                              String& axVersion, String& axArch, String& commonVersion);

    /// The cached directories, empty until they are known. Never destroyed, because threads that
    /// outlive main may ask for them. Do not touch them while another thread may be asking.
    static String& _homeDir;
    static String& _configDir;
    static String& _agentDepotDir;
};

}  // namespace ZAV

/// What the library needs of its host system: directories, files, commands.
///
/// Everything is static, may be called from any thread and reports failures by its result and by
/// trace lines; an operation that throws says so. Texts are converted to the local code page
/// before they reach the system (see String::c_str).
#pragma once

#include "base/zavstr.h"

namespace ZAV {

class Util {
public:
    Util() = delete;

    // ---- Directories and environment. Every directory that these hand out ends with "/". --------

    /// Whether `path` names anything that can be reached.
    static bool pathExists(const String& path);

    /// The host's short name: what uname reports, cut before its first ".".
    static String getHostName();

    /// The home directory that TOVRINHOME names. Worked out by the first call that succeeds and
    /// kept; a failed call is tried again by the next one. False, and `dir` empty, when TOVRINHOME
    /// is not set or names nothing that exists.
    static bool getTovrinHomeDir(String& dir);

    /// The directory "config/" under TOVRINHOME; kept, tried again and reported likewise.
    static bool getTovrinConfigDir(String& dir);

    /// The staging area of deployments: QVSDEPLOY_AGENTDEPOT, or else the home directory; created
    /// when it does not exist. Kept, tried again and reported likewise.
    static bool getAgentDepotDir(String& dir);

    /// Works the home directory out anew; `dir` is empty on failure.
    static bool initTovrinHomeDir(String& dir);
    /// Works the configuration directory out anew; `dir` is empty on failure.
    static bool initTovrinConfigDir(String& dir);
    /// Works the staging area out anew and creates it; `dir` is empty on failure.
    static bool initAgentDepotDir(String& dir);

    /// Makes the directory `path` and those above it that are missing, all with mode 0770 less the
    /// process's umask. Returns 0; 1 when `path` holds nothing but "/"; 2 when memory is short;
    /// else the errno value of the mkdir that failed. A directory that is already there gives
    /// EEXIST, so callers test pathExists first.
    static int createDir(const char* path);

    /// Where the central server of this home keeps its package depot. `dir` holds the home
    /// directory, "/" at its end, on entry and the depot home on return; `addPackages` asks for
    /// the packages below it, `create` for the directory to be made when it does not exist. Runs a
    /// command. Returns 0; 1 when the directory does not exist or cannot be made; 2 when the
    /// server's name cannot be found out, and then `dir` is unchanged.
    static int getDepotHome(String& dir, bool addPackages, bool create);

    // ---- Files ----------------------------------------------------------------------------------

    /// Reads a whole file. On 0 `*buf` is a malloc'ed buffer that holds the bytes and a terminating
    /// 0, which the caller frees, or null when the file is empty. Any other result is an errno
    /// value, and `*buf` is null. EINVAL without a path.
    static int readFile(const char* path, char** buf);

    /// Removes a file; false, and a trace line, when that fails.
    static bool deleteFile(const String& path);

    /// Copies the file `src` into the directory `dstDir` under its own name. Returns 0, an errno
    /// value, or 5 when `src` has no "/" beyond its first character. An existing file is
    /// overwritten; a file copied onto itself is left empty.
    static int copyFile(const String& src, const String& dstDir);

    /// Copies the file `src` to `dstDir`/`dstName`; returns 0 or an errno value.
    static int copyFile(const String& src, const String& dstDir, const String& dstName);

    /// Copies the file `src` to the file `dst`; returns 0 or the errno value of the first step that
    /// failed. A copy that failed on the way leaves what was written until then.
    static int _copyFile(const String& src, const String& dst);

    /// 0 when `path` is a directory, 1 when it is anything else that exists, 2 when it does not
    /// exist. `path` is cleaned in place first: surrounding double quotes (with the blanks behind a
    /// leading one) and trailing slashes and backslashes go. "/" alone is cleaned to nothing.
    static int fso_test(char* path);

    /// Cuts `text` before its first carriage return and then before its first line feed. Throws
    /// IndexOutOfBoundsException when there is nothing to search: an empty text, or one that begins
    /// with a carriage return.
    static void stripNewlineCharsFromOutput(String& text);

    /// Finds a Java installation: what the home's script bin/TovrinGetJavaHome prints, or else the
    /// directory that JAVA_HOME or JAVAHOME names. `homeDir` comes without a "/" at its end.
    /// `javaHome` keeps its value when nothing is found. Runs a command; throws
    /// IndexOutOfBoundsException when a value begins with a carriage return.
    static void getJavaHome(const String& homeDir, String& javaHome);

    // ---- Commands -------------------------------------------------------------------------------

    /// Runs a command line to its end. The line is split at blanks outside quotes; its first word
    /// is the path of an executable. `input` is what the child reads from its standard input, and
    /// then end of file; `nonBlocking` says that what is left of the output is taken without
    /// waiting for more once the child has ended.
    ///
    /// True when the child ended within the time-out (TIMEOUT in seconds, 300 by default): `rc` is
    /// its exit code, `stdOut` and `stdErr` are what it wrote. A child that could not be executed
    /// ends with 0. False when it could not be started (nothing is changed) or had to be killed
    /// (`stdOut` and `stdErr` hold what was read until then). Blocks until either.
    static bool runCommand(const String& command, int& rc, String& stdOut, String& stdErr,
                           const String& input, bool nonBlocking);

    /// The same with "NAME=value" texts for the child's environment: a list that ends in a null
    /// pointer, or null. The list stays the caller's.
    static bool runCommandEnv(const String& command, char** env, int& rc, String& stdOut,
                              String& stdErr, const String& input, bool nonBlocking);

    // ---- Reserved columns -----------------------------------------------------------------------

    /// Splits a RESERVED column, such as "A=06.20.00:li6263;C=06.20.00:li6263;G=06.20.00:li6263",
    /// into the level and architecture of the agent (A), the version without dots and architecture
    /// of the shared component (C) and the version without dots of the common component (G). False
    /// when the text is not of that form; what stands before the fault has been stored by then, and
    /// outputs whose product is not met keep their values.
    static bool parseReserved(const String& reserved, String& agentLevel, String& agentArch,
                              String& axVersion, String& axArch, String& commonVersion);

    /// The directories worked out so far, empty until then. Never destroyed, since threads that
    /// outlive main may ask for them; not to be touched while another thread may be asking.
    static String& _homeDir;
    static String& _configDir;
    static String& _agentDepotDir;
};

}  // namespace ZAV

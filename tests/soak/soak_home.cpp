#include "soak/soak_home.h"

#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace fs = std::filesystem;

namespace soak {
namespace {

void write(const std::string& path, const std::string& content, mode_t mode = 0644) {
    fs::create_directories(fs::path(path).parent_path());
    std::ofstream(path, std::ios::binary | std::ios::trunc) << content;
    ::chmod(path.c_str(), mode);
}

/// Longer than the host waits; then what nobody killed ends by itself.
const std::string kHang = "exec sleep " + std::to_string(3 * kChildSeconds);

/// What a program does by the word in $mood.
const std::string kMoods =
    "case $mood in\nhang) " + kHang + " ;;\ndeaf) trap '' TERM HUP INT; " + kHang + " ;;" + R"(

flood) head -c 2000000 /dev/zero | tr '\0' x ;;
both) head -c 300000 /dev/zero | tr '\0' o; head -c 300000 /dev/zero | tr '\0' e >&2 ;;
fail) echo "it went wrong" >&2; exit 3 ;;
suicide) kill -9 $$ ;;
heir) sleep 3 & ;;
esac
)";

/// The mood that belongs to a product code.
const std::string kMoodOfProduct = R"(case $product in
hg) mood=hang ;;
df) mood=deaf ;;
fl) mood=flood ;;
bo) mood=both ;;
er) mood=fail ;;
sk) mood=suicide ;;
he) mood=heir ;;
*) mood=well ;;
esac
)";

/// Once in a while a program hangs whatever it was asked.
const std::string kRarelyHang = "[ $(($$ % 499)) -ne 7 ] || " + kHang + "\n";

void script(const std::string& path, const std::string& body) {
    write(path, "#!/bin/sh\n" + body, 0755);
}

}  // namespace

SoakHome::SoakHome() {
    std::string pattern = fs::temp_directory_path() / "zavsoak.XXXXXX";
    if (::mkdtemp(pattern.data()) == nullptr) throw std::runtime_error("no scratch directory");
    root_ = pattern;
    for (const char* directory : {"/home/config", "/home/logs", "/depot", "/tmp", "/sockets",
                                  "/log", "/home/metafiles", "/home/tmp", "/home/work/scripts"}) {
        fs::create_directories(root_ + directory);
    }
    writePrograms();
    writeTranslator();
    writeUniversalAgent();
}

void SoakHome::writePrograms() const {
    std::string list = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";
    for (const char* product :
         {"ax", "lz", "ux", "db", "hg", "df", "fl", "bo", "er", "sk", "he", "um", "oy"}) {
        list += "\"" + std::string(product) + "\",\"A product\",\"li6263\",\"060100000\",\"100\"\n";
    }
    write(home() + "/list.txt", list);
    script(home() + "/bin/cinfo", kRarelyHang + "case $1 in\n-d) exec cat '" + home() +
                                      "/list.txt' ;;\n-p) printf 'Platform codes:\\nli6263 "
                                      "Product (%s)\\n' \"$2\" ;;\nesac\n");
    write(home() + "/bin/dynarch.shl", "os=Linux\ncArch=li6263\n");
    const std::string last = "for word; do product=$word; done\n";
    script(home() + "/bin/TovrinAgent", last + "case $product in k[0-9]*) echo $product >>'" +
                                            notes() + "' ;; esac\n" + kMoodOfProduct + kMoods);
    script(home() + "/bin/uninstall.sh", "product=$2\n" + std::string(kMoodOfProduct) + kMoods);
    script(home() + "/bin/installer", "mood=$1\n" + std::string(kMoods) + "echo installed\n");
}

void SoakHome::writeTranslator() const {
    script(home() + "/agtqvs6/li6263/bin/zav_xa",
           kRarelyHang + std::string("verb=$1\nfor word; do product=$word; done\n") +
               kMoodOfProduct + kMoods + R"(case $verb in
-g) printf 'a line before\nINSTANCE=%s\nKEY=value\n' "$product" ;;
-i) echo instance ;;
-p) cat >/dev/null ;;
esac
)");
}

void SoakHome::writeUniversalAgent() const {
    write(home() + "/config/um.config",
          "KUMP_META_PATH='" + home() + "/metafiles'\nKUM_WORK_PATH='" + home() +
              "/work/um'\nKUMP_RB_PATH=" + home() + "/rb\nKUMA_STARTUP_DP='SNMP'\n");
    write(home() + "/config/.ConfigData/kumenv", "*kumenv\n|DATAPROVIDER|SNMP|\n");
    write(depot() + "/app.mdl", "//APPL\n");
    write(depot() + "/one.sh", "one\n");
    script(home() + "/bin/um_console", "case $4 in getdptype*) printf SOCK ;; esac\n");
}

void SoakHome::removePushedFiles() const {
    std::error_code ignored;
    fs::remove_all(depot() + "/" + kPushDirectory, ignored);
}

void SoakHome::remove() const {
    std::error_code ignored;
    fs::remove_all(root_, ignored);
}

std::string contentOf(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

}  // namespace soak

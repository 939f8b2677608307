#include "fleet/link/program/link_file.h"

#include <nlohmann/json.hpp>
#include <optional>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/files/file_error.h"
#include "fleet/files/files.h"
#include "fleet/link/program/directory_lock.h"

using nlohmann::json;

namespace fleet {
namespace {

std::string fileIn(const std::string& directory) {
    return directory + "/link.json";
}

KeyPair pairIn(const json& document, const char* member) {
    const std::optional<KeyPair> pair = KeyPair::ofSeed(textIn(document, member));
    if (!pair || pair->kind() != KeyKind::User) {
        throw MessageError('"' + std::string(member) + "\" is no seed of a key");
    }
    return *pair;
}

Kept keptIn(const json& document) {
    Kept kept;
    kept.taken = numberIn(document, "taken");
    kept.journal = textIn(document, "journal");
    kept.adopted = momentIn(document, "adopted");
    kept.latest = momentIn(document, "latest");
    return kept;
}

std::string contentOf(const KeyPair& bus, const KeyPair& signing, const std::string& token,
                      const Kept& kept) {
    return textOf({{"bus", bus.seed()},
                   {"signing", signing.seed()},
                   {"token", token},
                   {"taken", kept.taken},
                   {"journal", kept.journal},
                   {"adopted", kept.adopted.count()},
                   {"latest", kept.latest.count()}}) +
           '\n';
}

}  // namespace

struct LinkFile::Content {
    KeyPair bus;
    KeyPair signing;
    std::string token;
    Kept kept;
};

LinkFile::LinkFile(const std::string& directory)
    : LinkFile(fileIn(directory), lockDirectory(directory), read(fileIn(directory))) {}

LinkFile::LinkFile(std::string path, sys::FileDescriptor lock, Content content)
    : path_(std::move(path)),
      lock_(std::move(lock)),
      bus_(content.bus),
      signing_(content.signing),
      token_(std::move(content.token)),
      kept_(std::move(content.kept)) {}

LinkFile::Content LinkFile::read(const std::string& path) {
    const std::string text = readFile(path, Secrecy::Secret);
    try {
        const json document = readDocument(text);
        return {pairIn(document, "bus"), pairIn(document, "signing"), textIn(document, "token"),
                keptIn(document)};
    } catch (const MessageError& error) {
        throw FileError(path + ": " + error.what() +
                        "; if there is no backup of it, enrol the host anew");
    }
}

void LinkFile::create(const std::string& directory, const KeyPair& bus, const KeyPair& signing,
                      const std::string& token) {
    insistOnNone(directory);
    replaceFile(fileIn(directory), contentOf(bus, signing, token, {}), Secrecy::Secret);
}

void LinkFile::insistOnNone(const std::string& directory) {
    const std::string path = fileIn(directory);
    if (isThere(path)) throw FileError(path + ": this host has been enrolled already");
}

void LinkFile::keep(const Kept& kept) {
    replaceFile(path_, contentOf(bus_, signing_, token_, kept), Secrecy::Secret);
    kept_ = kept;
}

}  // namespace fleet

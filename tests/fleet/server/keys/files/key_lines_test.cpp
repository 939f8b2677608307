#include "fleet/server/keys/files/key_lines.h"

#include <gtest/gtest.h>

#include <functional>
#include <string>

#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/files/private_file.h"
#include "tests/support/scratch_dir.h"

namespace {

using fleet::KeyKind;
using fleet::KeyLines;
using fleet::KeyPair;
using fleet::ReadKeyLines;

class KeyLinesFile : public testing::Test {
protected:
    std::string refusal(const std::function<void()>& act) const {
        try {
            act();
            return "";
        } catch (const fleet::KeysError& error) {
            return error.what();
        }
    }

    const ScratchDir scratch_;
    const std::string file_ = scratch_.path("keys");
};

TEST_F(KeyLinesFile, GivesBackValuesAndKeys) {
    const KeyPair key = KeyPair::make(KeyKind::Account);
    KeyLines lines;
    lines.add("name", "a value").add("empty", "").add("key", key);
    fleet::writePrivateFile(file_, lines.text());
    const ReadKeyLines read(file_);
    EXPECT_EQ(read.value("name"), "a value");
    EXPECT_EQ(read.value("empty"), "");
    EXPECT_EQ(read.key("key", KeyKind::Account).publicKey(), key.publicKey());
}

TEST_F(KeyLinesFile, NamesTheFileAndTheLineThatIsWrongAndNoSecret) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    std::string seed = key.seed();
    fleet::writePrivateFile(file_, "key " + seed + "\ncut " + seed.substr(1) + "\nname");
    const ReadKeyLines read(file_);
    for (const std::function<void()>& act : {std::function<void()>([&] { read.value("nam"); }),
                                             {[&] { read.value("name"); }},
                                             {[&] { read.key("key", KeyKind::Account); }},
                                             {[&] { read.key("cut", KeyKind::User); }}}) {
        const std::string words = refusal(act);
        EXPECT_NE(words.find(file_ + " is damaged: its line"), std::string::npos) << words;
        EXPECT_EQ(words.find(seed.substr(1)), std::string::npos);
    }
}

}  // namespace

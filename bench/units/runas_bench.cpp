// Reading a run-as database beside bare expat with handlers that build a tree of the same document:
// elements with their names, texts and children, all in UTF-8 as expat hands them out.

#include <benchmark/benchmark.h>
#include <expat.h>

#include <climits>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "base/zavrunas.h"
#include "temporary_file.h"

namespace {

/// What a database is to have, whichever is reached first.
struct Size {
    std::size_t bytes;
    unsigned agents;
};

struct Database {
    explicit Database(Size size) {
        text = "<runas>\n";
        for (; text.size() < size.bytes && agents < size.agents; ++agents) {
            const std::string number = std::to_string(agents);
            text += "    <agent>\n        <productCode>p" + number + "</productCode>\n";
            for (const char* instance : {"main", "second"}) {
                text += std::string("        <instance>\n            <name>") + instance +
                        "</name>\n            <user>monitor" + number +
                        "</user>\n        </instance>\n";
            }
            text += "    </agent>\n";
        }
        text += "</runas>\n";
    }
    std::string text;
    unsigned agents = 0;
};

struct Element {
    std::string name;
    std::string text;
    std::vector<std::unique_ptr<Element>> children;
};

/// What the handlers work on: the elements that are open, the outermost first.
using Open = std::vector<Element*>;

void start(void* data, const char* name, const char**) {
    Open& open = *static_cast<Open*>(data);
    auto element = std::make_unique<Element>();
    element->name = name;
    Element* const added = element.get();
    open.back()->children.push_back(std::move(element));
    open.push_back(added);
}

void end(void* data, const char*) {
    static_cast<Open*>(data)->pop_back();
}

void characters(void* data, const char* text, int length) {
    static_cast<Open*>(data)->back()->text.append(text, static_cast<std::size_t>(length));
}

void readWithExpat(const char* path, Element& root) {
    std::ifstream in(path, std::ios::binary);
    const std::string text{std::istreambuf_iterator<char>(in), {}};
    Open open{&root};
    const std::unique_ptr<XML_ParserStruct, decltype(&::XML_ParserFree)> parser(
        ::XML_ParserCreate(nullptr), &::XML_ParserFree);
    ::XML_SetUserData(parser.get(), &open);
    ::XML_SetElementHandler(parser.get(), start, end);
    ::XML_SetCharacterDataHandler(parser.get(), characters);
    if (::XML_Parse(parser.get(), text.data(), static_cast<int>(text.size()), 1) != XML_STATUS_OK) {
        throw std::runtime_error("not well-formed");
    }
}

void runas(benchmark::State& state, Size size) {
    const Database database(size);
    const TemporaryFile file(database.text);
    for (auto _ : state) {
        const ZAV::StartupDB startup{ZAV::String(file.path())};
        if (startup.getNumAgents() != database.agents) state.SkipWithError("agents are missing");
    }
}

void expat(benchmark::State& state, Size size) {
    const Database database(size);
    const TemporaryFile file(database.text);
    for (auto _ : state) {
        Element root;
        readWithExpat(file.path(), root);
        if (root.children.at(0)->children.size() != database.agents) {
            state.SkipWithError("agents are missing");
        }
    }
}

void add(const std::string& size, Size limits) {
    benchmark::RegisterBenchmark(("runas/" + size).c_str(), runas, limits);
    benchmark::RegisterBenchmark(("expat/" + size).c_str(), expat, limits);
}

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    // Both read the document as UTF-8, whatever locale this is run in.
    ::setenv("LC_ALL", "C.UTF-8", 1);
    for (std::size_t bytes = 1 << 10; bytes <= 1 << 20; bytes *= 4)
        add(std::to_string(bytes), {bytes, UINT_MAX});
    for (const unsigned agents : {10u, 1000u})
        add("agents/" + std::to_string(agents), {SIZE_MAX, agents});
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}

// The catalogue parser and resolver on any input: either the catalogue resolves
// (and then every emitter runs on it), or a CatalogueError names the file and the
// line at fault. Anything else, a crash or another exception, is a finding.
//
// The input is split into files at lines that read "----"; the first file is
// "idl/f0.idl", the next "idl/f1.idl" and so on.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "emit.h"
#include "model.h"

namespace {

[[noreturn]] void Finding(const std::string& what) {
    std::fprintf(stderr, "catalogue fuzzer: %s\n", what.c_str());
    std::abort();
}

struct Input {
    std::string name;
    std::string text;
    int lines = 0;
};

std::vector<Input> Split(const std::string& all) {
    std::vector<Input> files(1);
    std::size_t start = 0;
    while (start < all.size()) {
        std::size_t end = all.find('\n', start);
        if (end == std::string::npos) end = all.size();
        std::string line = all.substr(start, end - start);
        if (line == "----" && files.size() < 8) {
            files.emplace_back();
        } else {
            files.back().text += line;
            files.back().text += '\n';
            files.back().lines += 1;
        }
        start = end + 1;
    }
    for (std::size_t i = 0; i < files.size(); ++i) files[i].name = "idl/f" + std::to_string(i) + ".idl";
    return files;
}

// A location the input can account for: a line of one of its files, or, for what
// the catalogue as a whole lacks (no versions, no loader order), the catalogue
// directory without a line.
void CheckLocation(const tarngen::CatalogueError& e, const std::vector<Input>& files) {
    const tarngen::Location& at = e.location;
    const std::string prefix = at.ToString() + ": ";
    if (std::string(e.what()).rfind(prefix, 0) != 0) Finding(std::string("message without its location: ") + e.what());
    if (at.file == "idl" && at.line == 0) return;
    for (const Input& f : files)
        if (f.name == at.file) {
            if (at.line < 1 || at.line > f.lines) Finding("line out of range: " + std::string(e.what()));
            return;
        }
    Finding("unknown file in: " + std::string(e.what()));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::vector<Input> files = Split(std::string(reinterpret_cast<const char*>(data), size));
    try {
        std::vector<tarngen::FileSyntax> parsed;
        for (const Input& f : files) parsed.push_back(tarngen::ParseFile(f.name, f.text));
        tarngen::Model model = tarngen::Resolve(std::move(parsed));
        std::size_t emitted = 0;
        for (const auto& unit : model.units) {
            emitted += tarngen::EmitHeader(model, *unit).size();
            emitted += tarngen::EmitTypeinfo(model, *unit).size();
            emitted += tarngen::EmitStub(model, *unit).size();
            if (unit->standin) continue;
            emitted += tarngen::EmitDoublesHeader(model, *unit).size();
            emitted += tarngen::EmitDoubles(model, *unit).size();
        }
        emitted += tarngen::EmitVersions(model).size() + tarngen::EmitVersionsHeader(model).size();
        emitted += tarngen::EmitUmbrella(model).size() + tarngen::EmitDoublesUmbrella(model).size();
        if (emitted == 0) Finding("a resolved catalogue emitted nothing");
    } catch (const tarngen::CatalogueError& e) {
        CheckLocation(e, files);
    } catch (const std::exception& e) {
        Finding(std::string("not a catalogue error: ") + e.what());
    }
    return 0;
}

// tarn-gen: reads the catalogue and writes the generated sources of the library.
//
//   tarn-gen --idl <catalogue dir> --out <output dir> [--list <file>]
//
// Every *.idl file below the catalogue directory is read. An output file is
// rewritten only when its content changes, so unchanged sources do not rebuild.
// With --list nothing is generated: the file gets, as CMake variables, the
// catalogue files read and the files a run would write, by library (see
// tools/tarn-gen/generate.cmake), so that the build never restates their names.
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iostream>
#include <map>
#include <sstream>

#include "emit.h"
#include "model.h"

namespace fs = std::filesystem;

namespace {

std::string ReadFile(const fs::path& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw std::runtime_error("cannot read " + path.string());
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

void WriteIfChanged(const fs::path& path, const std::string& text) {
    std::error_code ignored;
    if (fs::exists(path, ignored)) {
        try {
            if (ReadFile(path) == text) return;
        } catch (const std::exception&) {
        }
    }
    fs::create_directories(path.parent_path());
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    if (!out) throw std::runtime_error("cannot write " + path.string());
}

int Usage() {
    std::cerr << "usage: tarn-gen --idl <catalogue dir> --out <output dir> [--list <file>]\n";
    return 2;
}

// One generated file and the library it is compiled into ("" for headers).
struct Output {
    std::string path;  // below the output directory
    std::string library;
    std::function<std::string()> text;
};

std::vector<Output> Outputs(const tarngen::Model& model) {
    using namespace tarngen;
    std::vector<Output> out;
    for (const auto& owned : model.units) {
        const Unit* unit = owned.get();
        std::string library = unit->standin ? "STANDINS" : "TYPES";
        out.push_back({unit->header, "", [&model, unit] { return EmitHeader(model, *unit); }});
        out.push_back({unit->outputDir + "/typeinfo.cpp", library, [&model, unit] { return EmitTypeinfo(model, *unit); }});
        out.push_back({unit->outputDir + "/stub.cpp", library, [&model, unit] { return EmitStub(model, *unit); }});
        if (unit->standin) continue;
        out.push_back({DoublesHeaderPath(*unit), "", [&model, unit] { return EmitDoublesHeader(model, *unit); }});
        out.push_back({unit->outputDir + "/doubles.cpp", "TESTING", [&model, unit] { return EmitDoubles(model, *unit); }});
    }
    out.push_back({"tarn/testing.h", "", [&model] { return EmitDoublesUmbrella(model); }});
    out.push_back({"tarn/versions.h", "", [&model] { return EmitVersionsHeader(model); }});
    out.push_back({"tarn/versions.cpp", "TYPES", [&model] { return EmitVersions(model); }});
    out.push_back({"tarn/types.h", "", [&model] { return EmitUmbrella(model); }});
    return out;
}

std::string ListFile(const std::vector<fs::path>& inputs, const fs::path& dir, const std::vector<Output>& outputs) {
    std::map<std::string, std::string> lists;
    for (const fs::path& input : inputs) lists["INPUTS"] += fs::absolute(input).generic_string() + ";";
    for (const Output& o : outputs) {
        std::string path = (dir / o.path).generic_string() + ";";
        lists["OUTPUTS"] += path;
        if (!o.library.empty()) lists[o.library + "_SOURCES"] += path;
    }
    std::string text = "# Written by tarn-gen --list. Do not edit.\n";
    for (const char* name : {"INPUTS", "OUTPUTS", "TYPES_SOURCES", "STANDINS_SOURCES", "TESTING_SOURCES"}) {
        std::string list = lists[name];
        if (!list.empty()) list.pop_back();
        text += std::string("set(TARN_GEN_") + name + " \"" + list + "\")\n";
    }
    return text;
}

}  // namespace

int main(int argc, char** argv) {
    fs::path idl, out, list;
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i];
        if (arg == "--idl" && i + 1 < argc) idl = argv[++i];
        else if (arg == "--out" && i + 1 < argc) out = argv[++i];
        else if (arg == "--list" && i + 1 < argc) list = argv[++i];
        else return Usage();
    }
    if (idl.empty() || out.empty()) return Usage();
    try {
        std::vector<fs::path> paths;
        for (const auto& entry : fs::recursive_directory_iterator(idl))
            if (entry.is_regular_file() && entry.path().extension() == ".idl") paths.push_back(entry.path());
        std::sort(paths.begin(), paths.end());
        std::vector<tarngen::FileSyntax> files;
        // Files are named from the catalogue directory's parent: "idl/tarn.idl".
        fs::path root = fs::absolute(idl).lexically_normal();
        if (root.filename().empty()) root = root.parent_path();
        fs::path shown = root.parent_path();
        for (const fs::path& path : paths) {
            std::string display = fs::absolute(path).lexically_normal().lexically_relative(shown).generic_string();
            files.push_back(tarngen::ParseFile(display, ReadFile(path)));
            for (const std::string& warning : files.back().warnings) std::cerr << warning << "\n";
        }
        tarngen::Model model = tarngen::Resolve(std::move(files));
        std::vector<Output> outputs = Outputs(model);
        if (!list.empty()) {
            WriteIfChanged(list, ListFile(paths, fs::absolute(out).lexically_normal(), outputs));
            return 0;
        }
        for (const Output& o : outputs) WriteIfChanged(out / o.path, o.text());
    } catch (const tarngen::CatalogueError& e) {
        std::cerr << e.what() << "\n";
        return 1;
    } catch (const std::exception& e) {
        std::cerr << "tarn-gen: " << e.what() << "\n";
        return 1;
    }
    return 0;
}

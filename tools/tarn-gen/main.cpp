// tarn-gen: reads the catalogue and writes the generated sources of the library.
//
//   tarn-gen --idl <catalogue dir> --out <output dir>
//
// Every *.idl file below the catalogue directory is read. An output file is
// rewritten only when its content changes, so unchanged sources do not rebuild.
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iostream>
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
    std::cerr << "usage: tarn-gen --idl <catalogue dir> --out <output dir>\n";
    return 2;
}

}  // namespace

int main(int argc, char** argv) {
    fs::path idl, out;
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i];
        if (arg == "--idl" && i + 1 < argc) idl = argv[++i];
        else if (arg == "--out" && i + 1 < argc) out = argv[++i];
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
        }
        tarngen::Model model = tarngen::Resolve(std::move(files));
        for (const auto& unit : model.units) {
            WriteIfChanged(out / unit->header, tarngen::EmitHeader(model, *unit));
            WriteIfChanged(out / unit->outputDir / "typeinfo.cpp", tarngen::EmitTypeinfo(model, *unit));
            WriteIfChanged(out / unit->outputDir / "stub.cpp", tarngen::EmitStub(model, *unit));
            if (unit->standin) continue;
            WriteIfChanged(out / tarngen::DoublesHeaderPath(*unit), tarngen::EmitDoublesHeader(model, *unit));
            WriteIfChanged(out / unit->outputDir / "doubles.cpp", tarngen::EmitDoubles(model, *unit));
        }
        WriteIfChanged(out / "tarn/testing.h", tarngen::EmitDoublesUmbrella(model));
        WriteIfChanged(out / "tarn/versions.h", tarngen::EmitVersionsHeader(model));
        WriteIfChanged(out / "tarn/versions.cpp", tarngen::EmitVersions(model));
        WriteIfChanged(out / "tarn/types.h", tarngen::EmitUmbrella(model));
    } catch (const tarngen::CatalogueError& e) {
        std::cerr << e.what() << "\n";
        return 1;
    } catch (const std::exception& e) {
        std::cerr << "tarn-gen: " << e.what() << "\n";
        return 1;
    }
    return 0;
}

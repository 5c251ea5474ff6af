// tarn-gen: reads the catalogue and writes the generated sources of the library.
//
//   tarn-gen --idl <file or dir> [--idl ...] --out <output dir> [--list <file>]
//
// Every *.idl file below a catalogue directory is read. An output file is
// rewritten only when its content changes, so unchanged sources do not rebuild.
// With --list nothing is generated: the file gets, as CMake variables, the
// catalogue files read and the files a run would write, by library (see
// TarnGenerate.cmake), so that the build never restates their names.
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iostream>
#include <map>
#include <sstream>

#include "emit.h"
#include "model.h"
#include "version.h"

namespace fs = std::filesystem;

namespace {

constexpr const char* kUsage =
    "usage: tarn-gen --idl <file or dir> [--idl ...] --out <output dir> [--list <file>]\n"
    "       tarn-gen --help | --version\n";

constexpr const char* kHelp = R"(
Generates the C++ bindings of a catalogue: per namespace a header of classes, a
detail header, a typeinfo source (records, dispatch, loader), a stub source
(client stubs) and test doubles; and the library-wide version list and umbrella
headers. The catalogue format is described in the project's idl/README.md.

  --idl PATH    a catalogue file, or a directory whose *.idl files (searched
                recursively) are read; may be given more than once
  --out DIR     where the generated files go; a file is rewritten only when its
                content changes
  --list FILE   generate nothing; write to FILE, as CMake variables, the
                catalogue files read and the files a run would write
  --version     the generator's version (generated code compiles only against
                the runtime of the same version)

Every error of a run is reported, each as "file:line: message", with the file
named as given on the command line. Exit status: 0 done, 1 catalogue errors or
files that cannot be read or written, 2 a command line that does not parse.
)";

class ToolError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

std::string ReadFile(const fs::path& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw ToolError("cannot read " + path.string());
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

void WriteIfChanged(const fs::path& path, const std::string& text) {
    std::error_code ignored;
    if (fs::exists(path, ignored)) {
        try {
            if (ReadFile(path) == text) return;
        } catch (const ToolError&) {
        }
    }
    std::error_code error;
    fs::create_directories(path.parent_path(), error);
    if (error) throw ToolError("cannot create " + path.parent_path().string() + ": " + error.message());
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    if (!out) throw ToolError("cannot write " + path.string());
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
        out.push_back({unit->detailHeader, "", [&model, unit] { return EmitDetailHeader(model, *unit); }});
        out.push_back({unit->outputDir + "/typeinfo.cpp", library, [&model, unit] { return EmitTypeinfo(model, *unit); }});
        out.push_back({unit->outputDir + "/stub.cpp", library, [&model, unit] { return EmitStub(model, *unit); }});
        if (unit->standin) continue;
        out.push_back({DoublesHeaderPath(*unit), "", [&model, unit] { return EmitDoublesHeader(model, *unit); }});
        out.push_back({unit->outputDir + "/doubles.cpp", "TESTING", [&model, unit] { return EmitDoubles(model, *unit); }});
    }
    out.push_back({LibraryFile(model, "testing.h"), "", [&model] { return EmitDoublesUmbrella(model); }});
    out.push_back({LibraryFile(model, "versions.h"), "", [&model] { return EmitVersionsHeader(model); }});
    out.push_back({LibraryFile(model, "versions.cpp"), "TYPES", [&model] { return EmitVersions(model); }});
    out.push_back({LibraryFile(model, "types.h"), "", [&model] { return EmitUmbrella(model); }});
    return out;
}

std::string ListFile(const std::vector<fs::path>& inputs, const fs::path& dir, const std::vector<Output>& outputs) {
    std::map<std::string, std::string> lists;
    for (const fs::path& input : inputs) lists["INPUTS"] += fs::absolute(input).lexically_normal().generic_string() + ";";
    for (const Output& o : outputs) {
        std::string path = (dir / o.path).generic_string() + ";";
        lists["OUTPUTS"] += path;
        lists[o.library.empty() ? "HEADERS" : o.library + "_SOURCES"] += path;
    }
    std::string text = "# Written by tarn-gen --list. Do not edit.\n";
    for (const char* name : {"INPUTS", "OUTPUTS", "HEADERS", "TYPES_SOURCES", "STANDINS_SOURCES", "TESTING_SOURCES"}) {
        std::string list = lists[name];
        if (!list.empty()) list.pop_back();
        text += std::string("set(TARN_GEN_") + name + " \"" + list + "\")\n";
    }
    return text;
}

// A catalogue file as messages name it (below the path the user gave) and as
// generated files name it (below the catalogue directory's name, whatever the
// checkout's place, so that generated sources do not differ between checkouts).
struct Input {
    fs::path path;
    std::string shown;
    std::string source;
};

std::vector<Input> FindInputs(const std::vector<fs::path>& given) {
    std::vector<Input> inputs;
    for (const fs::path& arg : given) {
        std::error_code error;
        fs::file_status status = fs::status(arg, error);
        if (!fs::exists(status)) throw ToolError("no catalogue file or directory " + arg.string());
        if (!fs::is_directory(status)) {
            fs::path absolute = fs::absolute(arg).lexically_normal();
            inputs.push_back({arg, arg.generic_string(), (absolute.parent_path().filename() / absolute.filename()).generic_string()});
            continue;
        }
        std::vector<Input> found;
        fs::path name = fs::absolute(arg).lexically_normal();
        if (name.filename().empty()) name = name.parent_path();
        fs::recursive_directory_iterator it(arg, error), end;
        for (; !error && it != end; it.increment(error)) {
            if (!it->is_regular_file() || it->path().extension() != ".idl") continue;
            fs::path below = it->path().lexically_relative(arg);
            found.push_back({it->path(), (arg / below).generic_string(), (name.filename() / below).generic_string()});
        }
        if (error) throw ToolError("cannot read the directory " + arg.string() + ": " + error.message());
        std::sort(found.begin(), found.end(), [](const Input& a, const Input& b) { return a.path < b.path; });
        inputs.insert(inputs.end(), found.begin(), found.end());
    }
    return inputs;
}

int Run(const std::vector<fs::path>& idl, const fs::path& out, const fs::path& list) {
    std::vector<Input> inputs = FindInputs(idl);
    tarngen::Diagnostics diagnostics;
    std::vector<tarngen::FileSyntax> files;
    for (const Input& input : inputs) {
        files.push_back(tarngen::ParseFile(input.shown, ReadFile(input.path), diagnostics));
        files.back().source = input.source;
        for (const std::string& warning : files.back().warnings) std::cerr << warning << "\n";
    }
    diagnostics.Check();
    tarngen::Model model = tarngen::Resolve(std::move(files));
    std::vector<Output> outputs = Outputs(model);
    if (!list.empty()) {
        std::vector<fs::path> paths;
        for (const Input& input : inputs) paths.push_back(input.path);
        WriteIfChanged(list, ListFile(paths, fs::absolute(out).lexically_normal(), outputs));
        return 0;
    }
    for (const Output& o : outputs) WriteIfChanged(out / o.path, o.text());
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    std::vector<fs::path> idl;
    fs::path out, list;
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i];
        if (arg == "--help" || arg == "-h") {
            std::cout << kUsage << kHelp;
            return 0;
        }
        if (arg == "--version") {
            std::cout << "tarn-gen " << tarngen::kGeneratorVersion << "\n";
            return 0;
        }
        if (arg == "--idl" && i + 1 < argc) idl.emplace_back(argv[++i]);
        else if (arg == "--out" && i + 1 < argc) out = argv[++i];
        else if (arg == "--list" && i + 1 < argc) list = argv[++i];
        else {
            std::cerr << "tarn-gen: " << (arg.starts_with("-") ? "unknown option or missing value: " : "unexpected argument: ")
                      << arg << "\n" << kUsage;
            return 2;
        }
    }
    if (idl.empty() || out.empty()) {
        std::cerr << "tarn-gen: --idl and --out are required\n" << kUsage;
        return 2;
    }
    try {
        return Run(idl, out, list);
    } catch (const tarngen::CatalogueError& e) {
        for (const std::string& message : e.all.empty() ? std::vector<std::string>{e.what()} : e.all) std::cerr << message << "\n";
        std::size_t count = std::max<std::size_t>(1, e.all.size());
        std::cerr << "tarn-gen: " << count << (count == 1 ? " error" : " errors") << " in the catalogue\n";
        return 1;
    } catch (const std::exception& e) {
        std::cerr << "tarn-gen: " << e.what() << "\n";
        return 1;
    }
}

// Library-wide files: the version list every loader registers, and the umbrella header.
#include "emit.h"
#include "names.h"
#include "printer.h"

namespace tarngen {

std::string LibraryFile(const Model& model, const std::string& name) { return model.root + "/" + name; }

std::string VersionsFunction(const Model& model) { return names::Capitalise(model.root) + "::RegisterVersions"; }

std::string EmitVersionsHeader(const Model& model) {
    Printer out;
    out.Raw(Banner("the catalogue's version list"));
    out.Print("#pragma once\n\n#include \"orbit/Registry.h\"\n\n"
              "namespace $ns$ {\n\n"
              "// Declares every catalogued version, then for each its full set of included versions\n"
              "// (itself among them) in registration order, as each namespace's loader must.\n"
              "void RegisterVersions(Orbit::VersionMap* versionMap);\n\n"
              "}  // namespace $ns$\n",
              {{"ns", names::Capitalise(model.root)}});
    return out.Text();
}

std::string EmitVersions(const Model& model) {
    Printer out;
    out.Raw(Banner("the catalogue's version list"));
    out.Print("#include \"$h$\"\n\n#include <cstddef>\n#include <string>\n\nnamespace {\n\n", {{"h", LibraryFile(model, "versions.h")}});
    out.Raw(""
            "struct VersionRow {\n    const char* name;\n    const char* serviceNamespace;\n    const char* versionId;\n"
            "    unsigned int flag;\n};\n\n"
            "constexpr VersionRow kVersions[] = {\n");
    for (const Version& v : model.versions)
        out.Print("    {\"$name$\", \"$ns$\", \"$id$\", $flag$},\n",
                  {{"name", v.name}, {"ns", v.serviceNamespace}, {"id", v.versionId}, {"flag", std::to_string(v.flag)}});
    out.Raw("};\n\n// Pairs of (version, included version) by row, in registration order.\nconstexpr unsigned char kInclusions[][2] = {\n");
    for (std::size_t i = 0; i < model.versions.size(); ++i) {
        std::string row = "   ";
        for (int j : model.versions[i].included) row += " {" + std::to_string(i) + ", " + std::to_string(j) + "},";
        out.Print("$row$\n", {{"row", row}});
    }
    out.Print("};\n\nstatic_assert(sizeof(kInclusions) / sizeof(kInclusions[0]) == $count$);\n\n}  // namespace\n\n",
              {{"count", std::to_string(model.InclusionCount())}});
    // The sixteen loaders register the same list: its strings are made once, by the
    // first, instead of two temporaries per call in every loader.
    out.Raw("namespace {\n\n// The rows as strings, made by the first loader and shared by the others.\n"
            "struct VersionStrings {\n"
            "    static constexpr std::size_t kCount = sizeof(kVersions) / sizeof(kVersions[0]);\n"
            "    std::string name[kCount];\n    std::string serviceNamespace[kCount];\n"
            "    std::string versionId[kCount];\n    const std::string taskType{\"cairn.Task\"};\n"
            "    const std::string none;\n\n"
            "    VersionStrings() {\n"
            "        for (std::size_t i = 0; i < kCount; ++i) {\n"
            "            name[i] = kVersions[i].name;\n"
            "            serviceNamespace[i] = kVersions[i].serviceNamespace;\n"
            "            versionId[i] = kVersions[i].versionId;\n"
            "        }\n    }\n};\n\n}  // namespace\n\n"
            "void ");
    out.Raw(VersionsFunction(model));
    out.Raw("(Orbit::VersionMap* versionMap) {\n"
            "    static const VersionStrings strings;\n"
            "    for (std::size_t i = 0; i < VersionStrings::kCount; ++i)\n"
            "        versionMap->AddVersion(strings.name[i], strings.serviceNamespace[i], strings.versionId[i], kVersions[i].flag,\n"
            "                               strings.taskType, 0, strings.none);\n"
            "    for (const auto& pair : kInclusions)\n"
            "        versionMap->AddIncludedVersion(strings.name[pair[0]], strings.name[pair[1]]);\n"
            "}\n");
    return out.Text();
}

std::string EmitUmbrella(const Model& model) {
    Printer out;
    out.Raw(Banner("the catalogue's loader order"));
    out.Raw("// Every namespace of the library.\n#pragma once\n\n");
    for (const Unit* unit : model.Units(false)) out.Print("#include \"$h$\"\n", {{"h", unit->header}});
    return out.Text();
}

}  // namespace tarngen

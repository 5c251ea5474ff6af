#include "html_output.h"

#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

#include "orbit/Records.h"

namespace tarncatalog {
namespace {

namespace fs = std::filesystem;

std::string Escape(const std::string& s) {
    std::string out;
    for (char c : s) {
        switch (c) {
        case '&': out += "&amp;"; break;
        case '<': out += "&lt;"; break;
        case '>': out += "&gt;"; break;
        case '"': out += "&quot;"; break;
        default: out += c;
        }
    }
    return out;
}

const char* KindWord(std::uint32_t kind) {
    switch (kind) {
    case Orbit::Kind::Enum: return "enumeration";
    case Orbit::Kind::Data: return "data object";
    case Orbit::Kind::Fault: return "fault";
    case Orbit::Kind::Managed: return "managed object";
    default: return "type";
    }
}

std::string FlagWords(std::uint32_t flags) {
    std::string words;
    for (const Orbit::NamedValue& f : Orbit::kFlagNames)
        if (flags & f.value) words += (words.empty() ? "" : ", ") + std::string(f.name);
    return std::to_string(flags) + (words.empty() ? "" : " (" + words + ")");
}

// A page of the site; `root` leads from the page back to the site's top.
class Page {
public:
    Page(const std::string& title, const std::string& root) : _root(root) {
        _out << "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n<title>" << Escape(title)
             << "</title>\n<link rel=\"stylesheet\" href=\"" << root << "site.css\">\n<script src=\"" << root
             << "site.js\" defer></script>\n</head>\n<body>\n<nav><a href=\"" << root << "index.html\">Namespaces</a> "
             << "<a href=\"" << root << "versions.html\">Versions</a> <label>API version <select id=\"api-version\">"
             << "</select></label></nav>\n<main>\n";
    }
    std::ostringstream& Out() { return _out; }
    const std::string& Root() const { return _root; }
    void Save(const fs::path& path) {
        _out << "</main>\n</body>\n</html>\n";
        std::ofstream file(path, std::ios::binary | std::ios::trunc);
        file << _out.str();
        if (!file) throw std::runtime_error("cannot write " + path.string());
    }

private:
    std::string _root;
    std::ostringstream _out;
};

class Site {
public:
    Site(const Catalog& catalog, const fs::path& dir) : _c(catalog), _dir(dir) {}

    int Write() {
        std::error_code error;
        fs::create_directories(_dir / "types", error);
        if (error) throw std::runtime_error("cannot create " + (_dir / "types").string() + ": " + error.message());
        Save("site.css", kStyle);
        Save("site.js", Script());
        Index();
        Versions();
        for (const auto* list : {&_c.types, &_c.standins})
            for (const TypeEntry& t : *list) TypePage(t);
        return _pages;
    }

private:
    void Save(const char* name, const std::string& text) {
        std::ofstream file(_dir / name, std::ios::binary | std::ios::trunc);
        file << text;
        if (!file) throw std::runtime_error("cannot write " + (_dir / name).string());
    }

    // A link to the type's page, or its name alone when the site has no page for it.
    std::string TypeLink(const std::string& wireName, const std::string& shown, const std::string& root) const {
        if (FindType(_c, wireName) == nullptr) return "<code>" + Escape(shown) + "</code>";
        return "<a href=\"" + root + "types/" + Escape(wireName) + ".html\"><code>" + Escape(shown) + "</code></a>";
    }
    std::string MemberType(const MemberEntry& m, const std::string& root) const {
        if (!m.type) return "none";
        return TypeLink(m.typeWireName.value_or(*m.type), m.typeWireName.value_or(*m.type), root);
    }

    void TypeRows(Page& page, const std::vector<TypeEntry>& types, const std::string& ns) {
        auto& out = page.Out();
        out << "<table>\n<tr><th>kind</th><th>type</th><th>C++ class</th><th>since</th></tr>\n";
        for (const TypeEntry& t : types) {
            if (t.ns != ns) continue;
            out << "<tr data-version=\"" << Escape(t.version) << "\"><td>" << KindWord(t.kind) << "</td><td>"
                << TypeLink(t.name, t.name, "") << "</td><td><code>" << Escape(t.className) << "</code></td><td>"
                << Escape(t.version) << "</td></tr>\n";
        }
        out << "</table>\n</section>\n";
    }

    void Index() {
        Page page("tarn API reference", "");
        auto& out = page.Out();
        out << "<h1>tarn API reference</h1>\n";
        if (_c.seenBy) out << "<p>Generated for API version <code>" << Escape(*_c.seenBy) << "</code>.</p>\n";
        out << "<p>Namespaces in the order their loaders run; <span id=\"shown-count\"></span></p>\n";
        for (const std::string& ns : _c.loaders) {
            out << "<section class=\"namespace\" id=\"" << Escape(ns) << "\">\n<h2>" << Escape(ns) << "</h2>\n";
            TypeRows(page, _c.types, ns);
        }
        std::vector<std::string> libraries;
        for (const TypeEntry& t : _c.standins)
            if (libraries.empty() || libraries.back() != t.ns) libraries.push_back(t.ns);
        out << "<h2>Stand-ins for other libraries' types</h2>\n";
        for (const std::string& ns : libraries) {
            out << "<section class=\"namespace\" id=\"" << Escape(ns) << "\">\n<h3>" << Escape(ns) << "</h3>\n";
            TypeRows(page, _c.standins, ns);
        }
        page.Save(_dir / "index.html");
        ++_pages;
    }

    void Versions() {
        Page page("API versions", "");
        auto& out = page.Out();
        out << "<h1>API versions</h1>\n<table>\n<tr><th>version</th><th>service namespace</th><th>id</th><th>includes</th></tr>\n";
        for (const VersionEntry& v : _c.versions) {
            out << "<tr data-version=\"" << Escape(v.name) << "\"><td><a href=\"index.html?v=" << Escape(v.name) << "\">"
                << Escape(v.name) << "</a></td><td>" << Escape(v.serviceNamespace) << "</td><td>" << Escape(v.versionId)
                << "</td><td>";
            for (const std::string& i : v.includes) out << "<code>" << Escape(i) << "</code> ";
            out << "</td></tr>\n";
        }
        out << "</table>\n";
        page.Save(_dir / "versions.html");
        ++_pages;
    }

    void PropertyRows(Page& page, const std::vector<MemberEntry>& properties, bool managed) {
        auto& out = page.Out();
        out << "<table>\n<tr><th>" << (managed ? "member" : "index") << "</th><th>property</th><th>type</th><th>flags</th>"
            << "<th>since</th><th>privilege</th></tr>\n";
        for (const MemberEntry& p : properties)
            out << "<tr data-version=\"" << Escape(p.version) << "\"><td>" << p.memberNumber << "</td><td id=\"" << Escape(p.name)
                << "\"><code>" << Escape(p.name) << "</code></td><td>" << MemberType(p, page.Root()) << "</td><td>"
                << FlagWords(p.flags) << "</td><td>" << Escape(p.version) << "</td><td>" << Escape(p.privilege.value_or(""))
                << "</td></tr>\n";
        out << "</table>\n";
    }

    void MethodRows(Page& page, const std::vector<MethodEntry>& methods) {
        auto& out = page.Out();
        out << "<table>\n<tr><th>member</th><th>method</th><th>wsdl name</th><th>parameters</th><th>result</th>"
            << "<th>faults</th><th>since</th><th>privilege</th></tr>\n";
        for (const MethodEntry& m : methods) {
            out << "<tr data-version=\"" << Escape(m.version) << "\"><td>" << m.memberNumber << "</td><td id=\"" << Escape(m.name)
                << "\"><code>" << Escape(m.name) << "</code>" << (m.task ? " (task)" : "") << "</td><td><code>"
                << Escape(m.wsdlName) << "</code></td><td><ul>";
            for (const MemberEntry& p : m.params)
                out << "<li data-version=\"" << Escape(p.version) << "\"><code>" << Escape(p.name) << "</code>: "
                    << MemberType(p, page.Root()) << ", flags " << FlagWords(p.flags) << ", since " << Escape(p.version) << "</li>";
            out << "</ul></td><td>" << MemberType(m.result, page.Root());
            if (m.result.type) out << ", flags " << FlagWords(m.result.flags);
            out << "</td><td>";
            for (const std::string& f : m.faults) out << TypeLink(FaultWireName(f), FaultWireName(f), page.Root()) << " ";
            out << "</td><td>" << Escape(m.version) << "</td><td>" << Escape(m.privilege.value_or("")) << "</td></tr>\n";
        }
        out << "</table>\n";
    }

    // Faults are listed by flat name.
    std::string FaultWireName(const std::string& flat) const {
        const TypeEntry* t = FindType(_c, flat);
        return t ? t->name : flat;
    }

    void TypePage(const TypeEntry& t) {
        Page page(t.name, "../");
        auto& out = page.Out();
        out << "<section class=\"type\" data-version=\"" << Escape(t.version) << "\">\n<h1>" << Escape(t.name) << "</h1>\n"
            << "<p class=\"unseen-note\" hidden>Not part of the chosen API version.</p>\n<table class=\"facts\">\n"
            << "<tr><th>kind</th><td>" << KindWord(t.kind) << (t.standin ? " (stand-in for another library's type)" : "")
            << "</td></tr>\n<tr><th>C++ class</th><td><code>" << Escape(t.className) << "</code></td></tr>\n"
            << "<tr><th>header</th><td><code>#include &quot;" << Escape(t.header) << "&quot;</code></td></tr>\n"
            << "<tr><th>flat name</th><td><code>" << Escape(t.flatName) << "</code></td></tr>\n"
            << "<tr><th>since</th><td>" << Escape(t.version) << "</td></tr>\n"
            << "<tr><th>namespace</th><td><a href=\"../index.html#" << Escape(t.ns) << "\">" << Escape(t.ns) << "</a></td></tr>\n"
            << "<tr><th>base chain</th><td>";
        for (std::size_t i = 0; i < t.baseChain.size(); ++i)
            out << (i ? " &larr; " : "") << TypeLink(t.baseChain[i], t.baseChain[i], "../");
        if (t.baseChain.empty()) out << "none";
        out << "</td></tr>\n</table>\n";
        if (t.kind == Orbit::Kind::Managed) {
            out << "<h2>Methods</h2>\n";
            MethodRows(page, t.methods);
        }
        if (t.kind == Orbit::Kind::Enum) {
            out << "<h2>Tags</h2>\n<table>\n<tr><th>value</th><th>tag</th></tr>\n";
            for (std::size_t i = 0; i < t.tags.size(); ++i) out << "<tr><td>" << i << "</td><td><code>" << Escape(t.tags[i]) << "</code></td></tr>\n";
            out << "</table>\n";
        } else {
            out << "<h2>Properties</h2>\n";
            PropertyRows(page, t.properties, t.kind == Orbit::Kind::Managed);
        }
        for (const TypeEntry* base : Ancestors(_c, t)) {
            if (base->methods.empty() && base->properties.empty()) continue;
            out << "<h2 class=\"inherited\">Inherited from " << TypeLink(base->name, base->name, "../") << "</h2>\n";
            if (!base->methods.empty()) MethodRows(page, base->methods);
            if (!base->properties.empty()) PropertyRows(page, base->properties, base->kind == Orbit::Kind::Managed);
        }
        out << "</section>\n";
        page.Save(_dir / "types" / (t.name + ".html"));
        ++_pages;
    }

    std::string Script() const {
        std::ostringstream js;
        js << "// Generated by tarn-catalog html. Which versions each version includes:\nconst INCLUDES = {\n";
        for (const VersionEntry& v : _c.versions) {
            js << "  \"" << v.name << "\": [";
            for (std::size_t i = 0; i < v.includes.size(); ++i) js << (i ? ", " : "") << "\"" << v.includes[i] << "\"";
            js << "],\n";
        }
        js << "};\nconst DEFAULT_VERSION = \"" << _c.seenBy.value_or("") << "\";\n" << kScript;
        return js.str();
    }

    static constexpr const char* kStyle = R"(body { font-family: sans-serif; margin: 0 2em 2em; }
nav { padding: .6em 0; border-bottom: 1px solid #ccc; margin-bottom: 1em; }
nav a { margin-right: 1.5em; }
table { border-collapse: collapse; margin-bottom: 1em; }
th, td { border: 1px solid #ddd; padding: .25em .5em; text-align: left; vertical-align: top; }
td ul { margin: 0; padding-left: 1.2em; }
.facts th { background: #f4f4f4; }
code { font-size: 95%; }
)";

    // Hides what the chosen version does not include, keeps the choice in the
    // links, and hides a namespace with nothing left to show.
    static constexpr const char* kScript = R"js(
function chosenVersion() {
  const asked = new URLSearchParams(location.search).get("v");
  if (asked !== null && asked in INCLUDES) return asked;
  return DEFAULT_VERSION;
}
function sees(version, introducedIn) {
  return version === "" || INCLUDES[version].includes(introducedIn);
}
function apply(version) {
  for (const el of document.querySelectorAll("[data-version]")) el.hidden = !sees(version, el.dataset.version);
  for (const section of document.querySelectorAll("section.namespace")) {
    section.hidden = section.querySelectorAll("tr[data-version]:not([hidden])").length === 0;
  }
  const type = document.querySelector("section.type");
  if (type && type.hidden) {
    type.hidden = false;
    for (const child of type.children) child.hidden = !child.classList.contains("unseen-note") && child.tagName !== "H1";
  }
  const count = document.getElementById("shown-count");
  if (count) {
    const rows = document.querySelectorAll("section.namespace tr[data-version]");
    const shown = [...rows].filter(r => !r.hidden).length;
    count.textContent = version === "" ? rows.length + " types." : shown + " of " + rows.length + " types are in " + version + ".";
  }
  for (const a of document.querySelectorAll("a[href]")) {
    const href = a.getAttribute("href");
    if (/^[a-z]+:/.test(href) || href.startsWith("#") || href.includes("?v=")) continue;
    const [path, fragment] = href.split("#");
    a.setAttribute("href", path + (version ? "?v=" + encodeURIComponent(version) : "") + (fragment ? "#" + fragment : ""));
  }
}
document.addEventListener("DOMContentLoaded", () => {
  const select = document.getElementById("api-version");
  const version = chosenVersion();
  select.add(new Option("every version", ""));
  for (const name of Object.keys(INCLUDES)) select.add(new Option(name, name));
  select.value = version;
  select.addEventListener("change", () => {
    const params = new URLSearchParams(location.search);
    params.set("v", select.value);
    location.search = params.toString();
  });
  apply(version);
});
)js";

    const Catalog& _c;
    fs::path _dir;
    int _pages = 0;
};

}  // namespace

int WriteSite(const Catalog& catalog, const std::string& dir) { return Site(catalog, dir).Write(); }

}  // namespace tarncatalog

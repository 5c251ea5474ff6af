// tarn-catalog: shows the tarn API as the runtime registered it. Linking
// libtarn-types is what registers it: its loaders run before main.
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "args.h"
#include "catalog.h"
#include "html_output.h"
#include "json_output.h"
#include "orbit/wire/Wsdl.h"
#include "text_output.h"

namespace {

constexpr int kNotFound = 1;
constexpr int kUsage = 2;

int Fail(int status, const std::string& message) {
    std::cerr << "tarn-catalog: " << message << "\n";
    if (status == kUsage) std::cerr << "Try 'tarn-catalog --help'.\n";
    return status;
}

int Run(const tarncatalog::Options& options) {
    using tarncatalog::Command;
    Orbit::Version* seenBy = nullptr;
    if (options.version) {
        seenBy = tarncatalog::FindVersion(*options.version);
        if (seenBy == nullptr)
            return Fail(kNotFound, "no version named '" + *options.version +
                                       "' is registered ('tarn-catalog versions' lists them)");
    }
    tarncatalog::Catalog catalog = tarncatalog::ReadCatalog(seenBy);

    switch (options.command) {
    case Command::Help:
        std::cout << tarncatalog::HelpText();
        break;
    case Command::ToolVersion:
        std::cout << "tarn-catalog " << TARN_VERSION << "\n";
        break;
    case Command::List:
        tarncatalog::WriteListing(catalog, std::cout);
        break;
    case Command::Versions:
        tarncatalog::WriteVersions(catalog, std::cout);
        break;
    case Command::Dump:
        tarncatalog::WriteJson(catalog, options.counters, std::cout);
        break;
    case Command::Wsdl:
        Orbit::Wire::WriteWsdl(*seenBy, std::cout);
        break;
    case Command::Html: {
        int pages = tarncatalog::WriteSite(catalog, options.outDir);
        std::cout << "tarn-catalog: " << pages << " pages in " << options.outDir << "\n";
        break;
    }
    case Command::Show: {
        if (const tarncatalog::TypeEntry* t = tarncatalog::FindType(catalog, options.typeName)) {
            tarncatalog::WriteType(catalog, *t, std::cout);
            return 0;
        }
        // Tell a hidden type from a missing one.
        tarncatalog::Catalog all = seenBy != nullptr ? tarncatalog::ReadCatalog(nullptr) : catalog;
        if (const tarncatalog::TypeEntry* t = tarncatalog::FindType(all, options.typeName); t && seenBy != nullptr)
            return Fail(kNotFound, "type '" + t->name + "' (" + t->version + ") is not visible to version '" +
                                       *options.version + "'");
        std::string message = "no type named '" + options.typeName + "' is registered";
        std::vector<std::string> close = tarncatalog::CloseNames(all, options.typeName);
        for (std::size_t i = 0; i < close.size(); ++i) message += (i == 0 ? "; did you mean " : " or ") + close[i];
        return Fail(kNotFound, message + (close.empty() ? " ('tarn-catalog' lists them)" : "?"));
    }
    }
    std::cout.flush();
    return std::cout ? 0 : kNotFound;
}

}  // namespace

int main(int argc, char** argv) {
    tarncatalog::Options options;
    try {
        options = tarncatalog::ParseArgs(std::vector<std::string>(argv + 1, argv + argc));
    } catch (const tarncatalog::UsageError& e) {
        return Fail(kUsage, e.what());
    }
    try {
        return Run(options);
    } catch (const std::exception& e) {
        return Fail(kNotFound, std::string("failed: ") + e.what());
    }
}

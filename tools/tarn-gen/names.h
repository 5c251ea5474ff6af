// Every name the generator derives, in one place. Each helper shows a worked example.
#pragma once

#include <string>
#include <vector>

namespace tarngen::names {

// "faultInjector" -> "FaultInjector"
std::string Capitalise(const std::string& word);
// "markLogs" -> "MARKLOGS"; characters that cannot stand in an identifier become '_'.
std::string Upper(const std::string& word);
// "tarn.vmprov.HostState" -> {"tarn", "vmprov", "HostState"}
std::vector<std::string> Segments(const std::string& dotted);
// "tarn.vmprov.ComputeSpecs.ConfigSpecOutput" -> "TarnVmprovComputeSpecsConfigSpecOutput"
std::string Flat(const std::string& wireName);
// "tarn.vmprov.ComputeSpecs.ConfigSpecOutput" -> "Tarn::Vmprov::ComputeSpecs::ConfigSpecOutput"
std::string ClassPath(const std::string& wireName);
// "tarn.cnxmgr.ConnectionState" -> "gTarnCnxmgrConnectionStateTypeInfo"
std::string Record(const std::string& wireName);
// A row of the runtime's records by its symbol: "String" -> "Orbit::gStringTypeInfo"
std::string RuntimeRecord(const std::string& symbol);
// "tarn.AlertManager" -> "gTarnAlertManagerMethodObjects"
std::string MethodObjects(const std::string& wireName);
// "tarn.cnxmgr" -> "TarnCnxmgrTypeinfoTypeInfoLoader"; "tarn" -> "TarnTypeinfoTypeInfoLoader"
std::string Loader(const std::string& unitName);
// "markLogs" -> "METHOD_MARKLOGS"
std::string MethodConstant(const std::string& methodName);
// ("LockMode", "xall") -> "LOCKMODE_XALL"
std::string TagConstant(const std::string& enumName, const std::string& tag);
// ("sic", kGet) -> "GetSic"; ("committed", kIs) -> "IsCommitted"; ("sic", kSet) -> "SetSic"
std::string Accessor(const char* prefix, const std::string& property);
// "sic" -> "sic_"
std::string Member(const std::string& property);
// A C++ keyword gets a trailing underscore: "delete" -> "delete_"; others pass.
std::string Identifier(const std::string& name);
// "tarn.vmprov" -> "tarn/vmprov"; "tarn" -> "tarn"
std::string SourceDir(const std::string& unitName);
// "tarn.vmprov" -> "tarn/vmprov.h"; "tarn" -> "tarn/tarn.h"; "cairn" -> "cairn/cairn.h"
std::string Header(const std::string& unitName);
// "tarn/vmprov.h" -> "tarn/detail/vmprov.h"
std::string DetailHeader(const std::string& header);

}  // namespace tarngen::names

#pragma once

#include "host/enforce/module/module_maps.h"
#include "host/enforce/module/module_plan.h"
#include "host/enforce/module/tardisk_file.h"

namespace Enforce {

// Has the module hash paths in a way that nobody can tell.
void ChooseHashing(const ModuleMaps& maps);

// Writes the rules about files below the entries that the domains use next. Nobody goes by them
// before the domain's word names that entry.
void WriteFileRules(const ModuleMaps& maps, const ModulePlan& plan);

// Removes those that no domain uses, once nobody goes by them anymore.
void RemoveUnusedFileRules(const ModuleMaps& maps);

// What Module::TellTardiskFiles() does, for these maps.
void WriteTardiskFiles(const ModuleMaps& maps, const TardiskFiles& files);

}  // namespace Enforce

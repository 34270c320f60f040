// Adjustments at the end of every acquisition for one distribution and one adapter model.
#pragma once

void SpecialCaseSystems();
void SpecialCaseBusses();
// On SuSE SLES-8 no slot supports hot plug.
void SpecialCaseSlots();
// One graphics controller model is a boot device wherever it sits.
void SpecialCaseAdapters();

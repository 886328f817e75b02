#include "OxQelLib/schema/OxQelFieldDef.h"

const OxQelFieldDef::PropertyMask OxQelFieldDef::IsPropertiesToGetAll = {true, true, true,
                                                                         true, true, true};
const OxQelFieldDef::PropertyMask OxQelFieldDef::IsPropertiesToGetNothing = {false, false, false,
                                                                             false, false, false};

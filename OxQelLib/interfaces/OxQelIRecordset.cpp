#include "OxQelLib/interfaces/OxQelIRecordset.h"

OX_IMPLEMENT_DYNAMIC(OxQelIRecordset, OxObject)
OX_IMPLEMENT_DYNAMIC(OxQelIEditRecordset, OxQelIRecordset)

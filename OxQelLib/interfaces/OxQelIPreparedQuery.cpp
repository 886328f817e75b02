#include "OxQelLib/interfaces/OxQelIPreparedQuery.h"

OX_IMPLEMENT_DYNAMIC(OxQelIPreparedQuery, OxObject)

OxObject* OxQelIPreparedQuery::clone() const {
    return nullptr;
}

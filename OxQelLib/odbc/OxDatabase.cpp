#include "OxQelLib/odbc/OxDatabase.h"

OxDatabase::~OxDatabase() = default;

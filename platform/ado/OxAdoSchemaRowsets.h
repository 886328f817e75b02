#pragma once

#include <memory>
#include <vector>

#include "platform/ado/OxAdoMemoryRowSource.h"
#include "platform/ado/OxAdoProvider.h"

// The schema rowsets of OpenSchema, built from the provider's catalog with the columns
// and restrictions the model publishes for them.
class OxAdoSchemaRowsets {
public:
    // Throws OxAdoProviderError (adErrFeatureNotAvailable) for a schema it does not know.
    static std::unique_ptr<OxAdoRowSource> build(OxAdoSession& session, int schema,
                                                 const std::vector<OxVariant>& restrictions);
};

#include <gtest/gtest.h>

#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoRecordset.h"
#include "platform/ado/OxAdoxCatalog.h"
#include "testprovider/OxAdoTestProvider.h"

using namespace OxAdo;

namespace {
class AdoCatalogTest : public ::testing::Test {
protected:
    void SetUp() override {
        script->addTable(L"people");
        script->addTable(L"v_people", L"VIEW");
        OxAdoColumnDesc id;
        id.name = L"id";
        id.type = adInteger;
        id.setProperty(L"Default", OxVariant(L"(0)"));
        OxAdoColumnDesc name;
        name.name = L"name";
        name.type = adVarWChar;
        name.definedSize = 40;
        script->columns[L"people"] = {id, name};
        script->procedures.push_back({{}, {}, L"proc1", 2});
        conn = OxAdoConnection::create();
        conn->open(OxAdoTest::kConnectionString);
        catalog->setActiveConnection(conn);
    }

    std::shared_ptr<OxAdoTest::Script> script = std::make_shared<OxAdoTest::Script>();
    OxAdoTest::Install install{script};
    std::shared_ptr<OxAdoConnection> conn;
    std::shared_ptr<OxAdoxCatalog> catalog = OxAdoxCatalog::create();
};
}  // namespace

TEST_F(AdoCatalogTest, TablesColumnsAndRenames) {
    OxAdoxTables& tables = catalog->tables();
    ASSERT_EQ(tables.count(), 2);
    EXPECT_EQ(tables.item(L"V_PEOPLE")->type(), L"VIEW");
    auto people = tables.item(L"people");
    ASSERT_EQ(people->columns().count(), 2);
    EXPECT_EQ(people->columns().item(L"id")->properties().item(L"Default")->value().str(), L"(0)");
    people->columns().item(L"name")->setName(L"full_name");
    EXPECT_TRUE(script->sawCall(L"renameColumn people name full_name"));
    // The type of a column in the source is fixed.
    EXPECT_THROW(people->columns().item(L"id")->setType(adDouble), OxComError);
    people->setName(L"persons");
    EXPECT_TRUE(script->sawCall(L"renameTable people persons"));
    tables.refresh();
    EXPECT_EQ(tables.item(L"persons")->columns().item(1L)->name(), L"full_name");
    EXPECT_THROW(tables.item(L"people"), OxComError);
    // A property written on a column of the source is written there.
    tables.item(L"persons")
        ->columns()
        .item(L"id")
        ->properties()
        .item(L"Default")
        ->setValue(OxVariant(L"7"));
    EXPECT_TRUE(script->sawCall(L"setColumnProperty persons id Default=7"));

    EXPECT_EQ(catalog->procedures().count(), 1);
    EXPECT_EQ(catalog->procedures().item(0L)->name(), L"proc1");
}

TEST_F(AdoCatalogTest, AppendedTablesCarryTheirColumnsAndProperties) {
    auto t = OxAdoxTable::create();
    t->setName(L"fresh");
    t->setParentCatalog(catalog);
    auto c = OxAdoxColumn::create();
    // No properties before the column knows its catalog.
    EXPECT_THROW(c->properties().item(L"Default"), OxComError);
    c->setParentCatalog(catalog);
    c->setName(L"a");
    c->setType(adVarWChar);
    c->setDefinedSize(10);
    c->properties().item(L"Default")->setValue(OxVariant(L"'x'"));
    c->properties().item(L"Nullable")->setValue(OxVariant(false));
    t->columns().append(c);
    t->columns().append(L"b", adInteger);
    EXPECT_THROW(t->columns().append(L"B", adInteger), OxComError);
    catalog->tables().append(t);
    EXPECT_TRUE(
        script->sawCall(L"createTable fresh a:202:10[Default='x'][Nullable=0][AutoIncrement=0]"
                        L"[Jet OLEDB:Allow Zero Length=0][Jet OLEDB:Compressed UNICODE Strings=0] "
                        L"b:3:0[Nullable=-1][AutoIncrement=0][Jet OLEDB:Allow Zero Length=0]"
                        L"[Jet OLEDB:Compressed UNICODE Strings=0]"))
        << script->calls.back();
    EXPECT_THROW(catalog->tables().append(t), OxComError);
    // Once appended, a new column goes to the source at once.
    t->columns().append(L"c", adDouble);
    EXPECT_TRUE(script->sawCall(L"addColumn fresh c"));
    catalog->tables().remove(OxVariant(L"fresh"));
    EXPECT_TRUE(script->sawCall(L"dropTable fresh"));
}

TEST_F(AdoCatalogTest, SchemaRowsetsListTablesAndIndexes) {
    script->indexes.push_back({{}, {}, L"people", L"pk", true, true, false, 1, L"id", false});
    auto rs = conn->openSchema(adSchemaTables,
                               {OxVariant(), OxVariant(), OxVariant(), OxVariant(L"TABLE")});
    ASSERT_EQ(rs->recordCount(), 1);
    EXPECT_EQ(rs->fields().item(L"TABLE_NAME")->value().str(), L"people");
    auto idx = conn->openSchema(adSchemaIndexes);
    ASSERT_EQ(idx->recordCount(), 1);
    EXPECT_EQ(idx->fields().item(L"INDEX_NAME")->value().str(), L"pk");
    EXPECT_EQ(idx->fields().item(L"PRIMARY_KEY")->value().boolVal(), VARIANT_TRUE);
    EXPECT_EQ(idx->fields().item(L"COLUMN_NAME")->value().str(), L"id");
    EXPECT_EQ(idx->fields().item(L"ORDINAL_POSITION")->value().ulVal(), 1u);
    EXPECT_THROW(conn->openSchema(99), OxComError);
}

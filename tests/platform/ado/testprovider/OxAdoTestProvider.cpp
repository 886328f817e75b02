#include "testprovider/OxAdoTestProvider.h"

#include "platform/ado/OxAdoProviderRegistry.h"
#include "platform/core/OxText.h"

namespace OxAdoTest {
Result Result::rowsOf(std::vector<OxAdoColumnInfo> columns,
                      std::vector<std::vector<OxVariant>> rows) {
    Result r;
    r.columns = std::move(columns);
    r.rows = std::move(rows);
    return r;
}

Result Result::affected(long rows) {
    Result r;
    r.hasRows = false;
    r.rowsAffected = rows;
    return r;
}

Result Result::failure(OxHResult number, const std::wstring& description, int32_t nativeError,
                       const std::wstring& sqlState) {
    Result r;
    r.error = OxAdoTest::error(number, description, nativeError, sqlState);
    return r;
}

OxAdoColumnInfo column(const std::wstring& name, int type, long size, const std::wstring& table,
                       bool autoIncrement) {
    OxAdoColumnInfo c;
    c.name = name;
    c.type = type;
    c.definedSize = size;
    c.baseTable = table;
    c.baseColumn = table.empty() ? std::wstring() : name;
    c.autoIncrement = autoIncrement;
    return c;
}

OxAdoProviderError error(OxHResult number, const std::wstring& description, int32_t nativeError,
                         const std::wstring& sqlState) {
    return OxAdoProviderError(number, description, nativeError, sqlState);
}

void Script::addTable(const std::wstring& name, const std::wstring& type) {
    tables.push_back({{}, {}, name, type, {}});
}

bool Script::sawCall(const std::wstring& call) const {
    for (const auto& c : calls)
        if (c == call)
            return true;
    return false;
}

std::wstring Script::log() const {
    std::wstring out;
    for (const auto& s : statements) {
        if (!out.empty())
            out += L"\n";
        out += s;
    }
    return out;
}

namespace {
class Rows : public OxAdoRowSource {
public:
    Rows(std::shared_ptr<Script> script, Result result)
        : m_script(std::move(script)), m_result(std::move(result)) {}

    const std::vector<OxAdoColumnInfo>& columns() const override { return m_result.columns; }

    bool fetch(std::vector<OxVariant>& values) override {
        if (m_result.failAfterRows >= 0 && m_next >= static_cast<size_t>(m_result.failAfterRows))
            throw *m_result.error;
        auto it = m_script->failOnce.find(L"fetch");
        if (it != m_script->failOnce.end()) {
            OxAdoProviderError e = it->second;
            m_script->failOnce.erase(it);
            throw e;
        }
        if (m_result.rows.empty())
            return false;
        if (m_next >= m_result.rows.size()) {
            if (!m_result.endless)
                return false;
            m_next = 0;
        }
        values = m_result.rows[m_next++];
        return true;
    }

private:
    std::shared_ptr<Script> m_script;
    Result m_result;
    size_t m_next = 0;
};

class Session : public OxAdoSession {
public:
    explicit Session(std::shared_ptr<Script> script) : m_script(std::move(script)) {}
    ~Session() override { close(); }

    std::wstring providerName() const override { return kProvider; }

    void open(const OpenArgs& args) override {
        m_script->opens.push_back(args);
        hit(L"open", L"open");
        ++m_script->openSessions;
        m_open = true;
    }
    void close() noexcept override {
        if (m_open) {
            m_open = false;
            --m_script->openSessions;
            m_script->calls.push_back(L"close");
        }
    }
    bool isBroken() const noexcept override { return m_script->broken; }

    std::unique_ptr<OxAdoRowSource> execute(const std::wstring& text,
                                            const std::vector<OxAdoParamValue>& params,
                                            const OxAdoExecArgs& args,
                                            long& rowsAffected) override {
        m_script->statements.push_back(text);
        m_script->parameters.push_back(params);
        m_script->timeouts.push_back(args.timeout);
        hit(L"execute", {});
        Result r;
        if (!m_script->results.empty()) {
            r = std::move(m_script->results.front());
            m_script->results.pop_front();
        } else {
            r.hasRows = OxText::findNoCase(text, L"SELECT") == 0;
            r.rowsAffected = r.hasRows ? -1 : 1;
        }
        if (r.error && r.failAfterRows < 0)
            throw *r.error;
        rowsAffected = r.rowsAffected;
        if (!r.hasRows || !args.wantRows)
            return nullptr;
        return std::make_unique<Rows>(m_script, std::move(r));
    }

    void beginTrans() override { hit(L"beginTrans", L"beginTrans"); }
    void commitTrans() override { hit(L"commitTrans", L"commitTrans"); }
    void rollbackTrans() override { hit(L"rollbackTrans", L"rollbackTrans"); }
    void setIsolationLevel(long level) override {
        hit(L"setIsolationLevel", L"setIsolationLevel " + std::to_wstring(level));
    }

    std::vector<OxAdoTableInfo> tables(const std::wstring&, const std::wstring&) override {
        hit(L"tables", L"tables");
        return m_script->tables;
    }
    std::vector<OxAdoColumnDesc> columns(const std::wstring& table) override {
        hit(L"columns", L"columns " + table);
        auto it = m_script->columns.find(table);
        return it == m_script->columns.end() ? std::vector<OxAdoColumnDesc>{} : it->second;
    }
    std::vector<OxAdoIndexInfo> indexes(const std::wstring& table) override {
        hit(L"indexes", L"indexes " + table);
        return m_script->indexes;
    }
    std::vector<std::wstring> primaryKey(const std::wstring& table) override {
        hit(L"primaryKey", L"primaryKey " + table);
        auto it = m_script->primaryKeys.find(table);
        return it == m_script->primaryKeys.end() ? std::vector<std::wstring>{} : it->second;
    }
    std::vector<OxAdoProcedureInfo> procedures() override {
        hit(L"procedures", L"procedures");
        return m_script->procedures;
    }

    void createTable(const OxAdoTableDesc& table) override {
        std::wstring call = L"createTable " + table.name;
        for (const auto& c : table.columns) {
            call += L" " + c.name + L":" + std::to_wstring(c.type) + L":" +
                    std::to_wstring(c.definedSize);
            for (const auto& [name, value] : c.properties) {
                OxVariant text;
                if (!value.isEmpty() && !OxHr::failed(value.tryChangeType(VT_BSTR, text)) &&
                    !text.bstr().empty())
                    call += L"[" + name + L"=" + text.str() + L"]";
            }
        }
        hit(L"createTable", call);
        m_script->addTable(table.name, table.type);
        m_script->columns[table.name] = table.columns;
    }
    void dropTable(const std::wstring& table) override {
        hit(L"dropTable", L"dropTable " + table);
        std::erase_if(m_script->tables, [&](const OxAdoTableInfo& t) { return t.name == table; });
    }
    void renameTable(const std::wstring& oldName, const std::wstring& newName) override {
        hit(L"renameTable", L"renameTable " + oldName + L" " + newName);
        for (auto& t : m_script->tables)
            if (t.name == oldName)
                t.name = newName;
        auto node = m_script->columns.extract(oldName);
        if (!node.empty()) {
            node.key() = newName;
            m_script->columns.insert(std::move(node));
        }
    }
    void addColumn(const std::wstring& table, const OxAdoColumnDesc& column) override {
        hit(L"addColumn", L"addColumn " + table + L" " + column.name);
        m_script->columns[table].push_back(column);
    }
    void dropColumn(const std::wstring& table, const std::wstring& column) override {
        hit(L"dropColumn", L"dropColumn " + table + L" " + column);
        std::erase_if(m_script->columns[table],
                      [&](const OxAdoColumnDesc& c) { return c.name == column; });
    }
    void renameColumn(const std::wstring& table, const std::wstring& oldName,
                      const std::wstring& newName) override {
        hit(L"renameColumn", L"renameColumn " + table + L" " + oldName + L" " + newName);
        for (auto& c : m_script->columns[table])
            if (c.name == oldName)
                c.name = newName;
    }
    void setColumnProperty(const std::wstring& table, const std::wstring& column,
                           const std::wstring& property, const OxVariant& value) override {
        OxVariant text;
        (void)value.tryChangeType(VT_BSTR, text);
        hit(L"setColumnProperty",
            L"setColumnProperty " + table + L" " + column + L" " + property + L"=" + text.str());
        for (auto& c : m_script->columns[table])
            if (c.name == column)
                c.setProperty(property, value);
    }
    std::vector<std::pair<std::wstring, OxVariant>> columnProperties() const override {
        auto props = OxAdoSession::columnProperties();
        props.emplace_back(L"Jet OLEDB:Allow Zero Length", OxVariant(false));
        props.emplace_back(L"Jet OLEDB:Compressed UNICODE Strings", OxVariant(false));
        return props;
    }
    OxVariant lastInsertedValue(const std::wstring& table, const std::wstring& column) override {
        hit(L"lastInsertedValue", L"lastInsertedValue " + table + L" " + column);
        return m_script->lastInserted;
    }
    std::vector<std::pair<std::wstring, OxVariant>> properties() const override {
        return {{L"DBMS Name", OxVariant(L"Script")}};
    }
    void setProperty(const std::wstring& name, const OxVariant&) override {
        hit(L"setProperty", L"setProperty " + name);
    }

private:
    // Records the call and raises the failure scripted for it.
    void hit(const std::wstring& name, const std::wstring& record) {
        if (!record.empty())
            m_script->calls.push_back(record);
        auto once = m_script->failOnce.find(name);
        if (once != m_script->failOnce.end()) {
            OxAdoProviderError e = once->second;
            m_script->failOnce.erase(once);
            throw e;
        }
        auto always = m_script->failAlways.find(name);
        if (always != m_script->failAlways.end())
            throw always->second;
    }

    std::shared_ptr<Script> m_script;
    bool m_open = false;
};
}  // namespace

Install::Install(std::shared_ptr<Script> script) {
    OxAdoProviderRegistry::add(kProvider, [script](const std::wstring&) {
        return std::unique_ptr<OxAdoSession>(new Session(script));
    });
}

Install::~Install() {
    OxAdoProviderRegistry::remove(kProvider);
}
}  // namespace OxAdoTest

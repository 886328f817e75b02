// 1,000,000 cells (100,000 rows x 10 columns of numbers, texts and dates), written and
// read by our code and by the baselines in the same run. Each measurement runs in a
// child process of its own, so its peak memory is its own.
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <freexl.h>
#include <xlsxwriter.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <functional>
#include <string>

#include "platform/core/OxText.h"
#include "platform/workbook/OxWorkbookReader.h"
#include "platform/workbook/OxWorkbookWriter.h"

namespace fs = std::filesystem;

namespace {
constexpr uint32_t kRows = 100000;
constexpr uint32_t kCols = 10;
const char* const kCategories[] = {"alpha",   "beta", "gamma", "delta",  "epsilon", "zeta",   "eta",
                                   "theta",   "iota", "kappa", "lambda", "mu",      "nu",     "xi",
                                   "omicron", "pi",   "rho",   "sigma",  "tau",     "upsilon"};

// The value of a cell: kind 0 number, 1 text, 2 date (a 1900-system serial).
struct Value {
    int kind;
    double number;
    char text[96];
};

void valueAt(uint32_t r, uint32_t c, Value& v) {
    v.kind = 0;
    switch (c) {
        case 0:
            v.number = r;
            return;
        case 1:
            v.number = r * 1.25 + 0.001;
            return;
        case 2:
            v.kind = 1;
            std::snprintf(v.text, sizeof v.text, "unique text %u", r);
            return;
        case 3:
            v.kind = 1;
            std::snprintf(v.text, sizeof v.text, "%s", kCategories[r % 20]);
            return;
        case 4:
            v.kind = 2;
            v.number = 36526 + r % 9000;
            return;
        case 5:
            v.number = (r % 997) / 7.0;
            return;
        case 6:
            v.kind = 1;
            std::snprintf(v.text, sizeof v.text, "item %u", r % 1000);
            return;
        case 7:
            v.number = r % 100;
            return;
        case 8:
            v.kind = 2;
            v.number = 40000 + (r % 5000) + (r % 86400) / 86400.0;
            return;
        default:
            v.kind = 1;
            std::snprintf(v.text, sizeof v.text,
                          "a longer unique text for row %u, with some words after it", r);
    }
}

struct Result {
    double wall = 0;  // seconds
    double cpu = 0;
    double peakMb = 0;
    bool ok = false;
};

// Runs f in a child process; the child's exit status says whether it worked.
Result measure(const std::function<bool()>& f) {
    Result res;
    std::fflush(stdout);
    const auto start = std::chrono::steady_clock::now();
    const pid_t pid = fork();
    if (pid == 0)
        _exit(f() ? 0 : 1);
    int status = 0;
    struct rusage ru {};
    wait4(pid, &status, 0, &ru);
    res.wall = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    res.cpu = ru.ru_utime.tv_sec + ru.ru_utime.tv_usec / 1e6 + ru.ru_stime.tv_sec +
              ru.ru_stime.tv_usec / 1e6;
    res.peakMb = ru.ru_maxrss / 1024.0;
    res.ok = WIFEXITED(status) && WEXITSTATUS(status) == 0;
    return res;
}

bool runProgram(const std::vector<std::string>& argv) {
    const pid_t pid = fork();
    if (pid == 0) {
        std::vector<char*> args;
        for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
        args.push_back(nullptr);
        freopen("/dev/null", "w", stdout);
        freopen("/dev/null", "w", stderr);
        execvp(args[0], args.data());
        _exit(127);
    }
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

bool writeOurs(const std::string& path, OxWorkbookInfo::Format format, uint32_t sheets) {
    OxWorkbookError error;
    auto w = OxWorkbookWriter::create(OxText::fromUtf8(path), format, error);
    if (!w)
        return false;
    const uint32_t perSheet = kRows / sheets;
    OxWorkbookRow row;
    row.cells.resize(kCols);
    Value v;
    for (uint32_t s = 0; s < sheets; ++s) {
        if (!w->addSheet(L"Data" + std::to_wstring(s + 1)))
            return false;
        for (uint32_t r = 0; r < perSheet; ++r) {
            row.index = r;
            for (uint32_t c = 0; c < kCols; ++c) {
                valueAt(s * perSheet + r, c, v);
                OxWorkbookCell& cell = row.cells[c];
                cell.column = c;
                cell.type = v.kind == 1   ? OxWorkbookCell::Text
                            : v.kind == 2 ? OxWorkbookCell::Date
                                          : OxWorkbookCell::Number;
                cell.number = v.number;
                if (v.kind == 1) {
                    cell.text.clear();
                    OxText::appendFromUtf8(cell.text, v.text);
                }
            }
            if (!w->writeRow(row))
                return false;
        }
    }
    return w->commit();
}

bool writeLibxlsxwriter(const std::string& path) {
    lxw_workbook_options options = {};
    options.constant_memory = LXW_TRUE;
    lxw_workbook* wb = workbook_new_opt(path.c_str(), &options);
    if (!wb)
        return false;
    lxw_worksheet* ws = workbook_add_worksheet(wb, "Data1");
    lxw_format* date = workbook_add_format(wb);
    format_set_num_format(date, "yyyy-mm-dd hh:mm:ss");
    Value v;
    for (uint32_t r = 0; r < kRows; ++r)
        for (uint32_t c = 0; c < kCols; ++c) {
            valueAt(r, c, v);
            if (v.kind == 1)
                worksheet_write_string(ws, r, static_cast<lxw_col_t>(c), v.text, nullptr);
            else
                worksheet_write_number(ws, r, static_cast<lxw_col_t>(c), v.number,
                                       v.kind == 2 ? date : nullptr);
        }
    return workbook_close(wb) == LXW_NO_ERROR;
}

bool readOurs(const std::string& path, uint64_t expectCells) {
    OxWorkbookError error;
    auto r = OxWorkbookReader::open(OxText::fromUtf8(path), error);
    if (!r)
        return false;
    uint64_t cells = 0, chars = 0;
    double sum = 0;
    OxWorkbookRow row;
    for (size_t s = 0; s < r->sheetCount(); ++s) {
        if (!r->beginSheet(s))
            return false;
        while (r->nextRow(row))
            for (const auto& c : row.cells) {
                ++cells;
                sum += c.number;
                chars += c.text.size();
            }
        if (r->error())
            return false;
    }
    std::printf("%s", sum == 0.123 && chars == 7 ? " " : "");  // keeps the loop honest
    return cells == expectCells;
}

bool readFreexl(const std::string& path, uint64_t expectCells) {
    const void* h = nullptr;
    if (freexl_open(path.c_str(), &h) != FREEXL_OK || !h)
        return false;
    unsigned int sheets = 0;
    freexl_get_info(h, FREEXL_BIFF_SHEET_COUNT, &sheets);
    uint64_t cells = 0, chars = 0;
    double sum = 0;
    for (unsigned short s = 0; s < sheets; ++s) {
        unsigned int rows = 0;
        unsigned short cols = 0;
        if (freexl_select_active_worksheet(h, s) != FREEXL_OK ||
            freexl_worksheet_dimensions(h, &rows, &cols) != FREEXL_OK)
            return false;
        for (unsigned int r = 0; r < rows; ++r)
            for (unsigned short c = 0; c < cols; ++c) {
                FreeXL_CellValue v;
                if (freexl_get_cell_value(h, r, c, &v) != FREEXL_OK)
                    return false;
                if (v.type == FREEXL_CELL_NULL)
                    continue;
                ++cells;
                if (v.type == FREEXL_CELL_INT)
                    sum += v.value.int_value;
                else if (v.type == FREEXL_CELL_DOUBLE)
                    sum += v.value.double_value;
                else
                    chars += std::strlen(v.value.text_value);
            }
    }
    freexl_close(h);
    std::printf("%s", sum == 0.123 && chars == 7 ? " " : "");
    return cells == expectCells;
}

void line(const char* what, const Result& r, const Result* base) {
    std::printf("%-44s %8.2f s %8.2f s cpu %8.1f MB", what, r.wall, r.cpu, r.peakMb);
    if (base)
        std::printf("   time x%.2f  memory x%.2f", r.wall / base->wall, r.peakMb / base->peakMb);
    std::printf("%s\n", r.ok ? "" : "   FAILED");
}

std::string soffice(const std::string& profile, const std::string& filter, const std::string& in,
                    const std::string& outdir) {
    return runProgram({"soffice", "-env:UserInstallation=file://" + profile, "--headless",
                       "--norestore", "--convert-to", filter, "--outdir", outdir, in})
               ? outdir
               : std::string();
}
}  // namespace

int main() {
    const fs::path dir =
        fs::temp_directory_path() / ("oxqel-bench-workbook-" + std::to_string(getpid()));
    fs::create_directories(dir);
    const std::string xlsxOurs = (dir / "ours.xlsx").string();
    const std::string xlsxLxw = (dir / "lxw.xlsx").string();
    const std::string xlsOurs = (dir / "ours.xls").string();
    const uint64_t cells = static_cast<uint64_t>(kRows) * kCols;
    std::printf(
        "1,000,000 cells: %u rows x %u columns (the .xls holds them in two sheets of "
        "%u rows)\n\n",
        kRows, kCols, kRows / 2);
    std::printf("%-44s %10s %15s %11s\n", "", "wall", "cpu", "peak RSS");

    const Result lxw = measure([&] { return writeLibxlsxwriter(xlsxLxw); });
    const Result wx = measure([&] { return writeOurs(xlsxOurs, OxWorkbookInfo::Xlsx, 1); });
    line("write .xlsx: libxlsxwriter (constant memory)", lxw, nullptr);
    line("write .xlsx: ours", wx, &lxw);

    const Result wxls = measure([&] { return writeOurs(xlsOurs, OxWorkbookInfo::Xls, 2); });
    const Result fx = measure([&] { return readFreexl(xlsOurs, cells); });
    const Result rxls = measure([&] { return readOurs(xlsOurs, cells); });
    line("read .xls: FreeXL", fx, nullptr);
    line("read .xls: ours", rxls, &fx);

    const Result rx = measure([&] { return readOurs(xlsxOurs, cells); });

    // LibreOffice: what a user would otherwise run (a warm-up run creates its profile).
    const std::string profile = (dir / "lo-profile").string();
    const std::string filterCsv =
        "csv:Text - txt - csv (StarCalc):44,34,76,1,,0,false,true,false,false,false,-1";
    soffice(profile, filterCsv, xlsOurs, (dir / "warm").string());
    const Result loRead = measure(
        [&] { return !soffice(profile, filterCsv, xlsxOurs, (dir / "csv").string()).empty(); });
    line("read .xlsx: LibreOffice xlsx -> csv", loRead, nullptr);
    line("read .xlsx: ours", rx, &loRead);
    const Result loWrite = measure([&] {
        return !soffice(profile, "xls:MS Excel 97", xlsxOurs, (dir / "xls").string()).empty();
    });
    line("write .xls: LibreOffice xlsx -> xls", loWrite, nullptr);
    line("write .xls: ours", wxls, &loWrite);

    std::printf("\ntargets: .xlsx write at most 1.20x libxlsxwriter: %s (x%.2f)\n",
                wx.wall <= 1.2 * lxw.wall ? "met" : "MISSED", wx.wall / lxw.wall);
    std::printf(
        "         .xls read at least 3x faster than FreeXL with less memory: %s "
        "(%.1fx faster, memory x%.2f)\n",
        fx.wall >= 3 * rxls.wall && rxls.peakMb < fx.peakMb ? "met" : "MISSED", fx.wall / rxls.wall,
        rxls.peakMb / fx.peakMb);
    std::printf("file sizes: ours.xlsx %.1f MB, libxlsxwriter %.1f MB, ours.xls %.1f MB\n",
                fs::file_size(xlsxOurs) / 1e6, fs::file_size(xlsxLxw) / 1e6,
                fs::file_size(xlsOurs) / 1e6);
    std::error_code ec;
    fs::remove_all(dir, ec);
    return lxw.ok && wx.ok && wxls.ok && fx.ok && rxls.ok && rx.ok ? 0 : 1;
}

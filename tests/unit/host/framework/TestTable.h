#ifndef ZRM_TESTS_TEST_TABLE_H
#define ZRM_TESTS_TEST_TABLE_H

#include "framework/TableManager.h"
#include "framework/ctreq.h"
#include "host/framework/Request.h"
#include "unit/host/framework/Conditions.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <functional>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm::host;

/// A small table for the tests of the framework: two character columns that name a log, one of
/// UTF-8, and a number.
struct TestRow {
    char logpath[16];
    char logname[12];
    char text[32];
    std::int32_t number;

    TestRow(std::string_view path, std::string_view name, std::string_view content,
            std::int32_t value)
        : number(value) {
        fill(logpath, path);
        fill(logname, name);
        fill(text, content);
    }
    char* bytes() { return reinterpret_cast<char*>(this); }

private:
    template <std::size_t N> static void fill(char (&field)[N], std::string_view content) {
        std::memset(field, ' ', N);
        std::memcpy(field, content.data(), std::min(content.size(), N));
    }
};

/// A request on the test table.
class TestRequest : public ctreq {
public:
    TestRequest(RequestDetail* detail, ContextInfo* context, TableManager* manager)
        : ctreq(detail, context, manager) {
        rowSize = sizeof(TestRow);
        allocSize = 3;
    }
    ~TestRequest() override {
        if (onDestruction) {
            onDestruction();
        }
    }
    void TakeSample() override {
        if (onSample) {
            onSample(*this);
        }
    }
    int NumColumns() override { return 4; }
    unsigned GetColumnInfo(ColumnInfo* info, int index) override {
        static constexpr ColumnInfo columns[] = {
            {"logpath", offsetof(TestRow, logpath), 16, COLUMN_CHARACTER},
            {"logname", offsetof(TestRow, logname), 12, COLUMN_CHARACTER},
            {"text", offsetof(TestRow, text), 32, COLUMN_UTF8},
            {"number", offsetof(TestRow, number), 4, COLUMN_INTEGER},
        };
        *info = columns[index];
        return 0;
    }
    unsigned ColumnIsException(char* row, char* column, _IntfOper op, char* value) override {
        return onForeignColumn ? onForeignColumn(row, column, op, value) : 0;
    }

    std::function<void()> onDestruction;
    std::function<void(TestRequest&)> onSample;
    std::function<unsigned(char*, std::string, _IntfOper, char*)> onForeignColumn;
};

/// The test table's manager.
class TestManager : public TableManager {
public:
    explicit TestManager(const char* name = "TESTTABLE") : TableManager("TST", name) {}
    ctreq* CreateCtreq(RequestDetail* detail, ContextInfo* context) override {
        if (!gives) {
            return nullptr;
        }
        auto* const request = new TestRequest(detail, context, this);
        if (onCreate) {
            onCreate(*request);
        }
        return request;
    }
    /// The requests that fan-out would reach.
    std::vector<void*> linked() {
        std::vector<void*> result;
        SYS1_GetLock(lock());
        LinkedListIter walk(requests());
        while (void* const element = walk.Next()) {
            result.push_back(element);
        }
        SYS1_ReleaseLock(lock());
        return result;
    }

    bool gives = true;
    std::function<void(TestRequest&)> onCreate;
};

/// Keeps what it receives.
class TestReceiver : public RowReceiver {
public:
    unsigned receive(const ctreq& request, const char* rows, unsigned count) override {
        ++dispatches;
        for (unsigned index = 0; index < count; ++index) {
            TestRow row("", "", "", 0);
            std::memcpy(row.bytes(), rows + std::size_t{index} * request.rowSize, sizeof row);
            numbers.push_back(row.number);
        }
        return status;
    }
    void stopped(const ctreq& /*request*/, unsigned reason) override { reasons.push_back(reason); }

    unsigned status = 0;
    int dispatches = 0;
    std::vector<int> numbers;
    std::vector<unsigned> reasons;
};

#endif

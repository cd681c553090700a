#include "host/diagnose/LogLedgers.h"

#include "host/base/JsonWriter.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

std::string jsonOf(const LogLedgerView& ledger, bool withSamples) {
    return JsonWriter::text(
        [&](JsonWriter& json) { LogLedgers::write(json, ledger, withSamples); });
}

TEST(LogLedgers, WritesWhatWasReadAndSkipped) {
    LogLedgerView ledger;
    EXPECT_EQ(
        jsonOf(ledger, false),
        R"({"bytes_read":0,"lines":0,"rows":0,"format_errors":0,"percent_parsed":null,"without_time":0,)"
        R"("truncations":0,"skipped_bytes":0,"restarts":0,"last_entry":null,"follow":null,"warnings":[]})");
    ledger.bytesRead = 1;
    ledger.lines = 7;
    ledger.rows = 3;
    ledger.formatErrors = 4;
    ledger.withoutTime = 5;
    ledger.truncations = 6;
    ledger.skippedBytes = 7;
    ledger.restarts = 8;
    ledger.lastEntry = 1000;
    ledger.warnings = {{"missing", 2000, "It is gone."}};
    ledger.rejected = {{3000, "a \"line\" \xff", "it does not fit"}};
    ledger.shapes = {{"a: 9", 4}};
    ledger.skipped = {{4000, 5, 6, std::nullopt, true}, {5000, 0, 1, 9, false}};
    const std::string numbers =
        R"({"bytes_read":1,"lines":7,"rows":3,"format_errors":4,"percent_parsed":42.8,)"
        R"("without_time":5,"truncations":6,)"
        R"("skipped_bytes":7,"restarts":8,"last_entry":"1970-01-01T00:00:01.000Z","follow":null,)"
        R"("warnings":[{"kind":"missing","since":"1970-01-01T00:00:02.000Z",)"
        R"("text":"It is gone."}])";
    EXPECT_EQ(jsonOf(ledger, false), numbers + "}");
    EXPECT_EQ(jsonOf(ledger, true),
              numbers + R"(,"rejected":[{"time":"1970-01-01T00:00:03.000Z",)"
                        "\"line\":\"a \\\"line\\\" \xef\xbf\xbd\",\"reason\":\"it does not fit\"}],"
                        R"("shapes":[{"shape":"a: 9","count":4}],)"
                        R"("skipped":[{"time":"1970-01-01T00:00:04.000Z","from":5,"to":6,)"
                        R"("unread":null,"regrown":true},{"time":"1970-01-01T00:00:05.000Z",)"
                        R"("from":0,"to":1,"unread":9,"regrown":false}]})");
}

} // namespace

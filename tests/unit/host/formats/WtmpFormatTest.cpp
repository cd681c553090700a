#include "host/formats/WtmpFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <string_view>

#include <arpa/inet.h>
#include <utmpx.h>

using namespace zrm;
using namespace zrm::host;

namespace {

/// A login from 203.0.113.7.
utmpx login() {
    utmpx record{};
    record.ut_type = USER_PROCESS;
    record.ut_pid = 412;
    std::strcpy(record.ut_line, "pts/0");
    std::memcpy(record.ut_id, "ts/0", 4);
    std::strcpy(record.ut_user, "anna");
    std::strcpy(record.ut_host, "client.example.com");
    record.ut_session = 77;
    record.ut_tv.tv_sec = 1795341600;
    EXPECT_EQ(inet_pton(AF_INET, "203.0.113.7", record.ut_addr_v6), 1);
    return record;
}

class Records : public testing::Test {
protected:
    Records() : m_format(*WtmpFormat::make({})), m_reader(m_format->reader()) {}

    bool read(const utmpx& record) {
        return read({reinterpret_cast<const char*>(&record), sizeof record});
    }
    bool read(std::string_view entry) {
        // Of the exact size and at any address.
        m_entry.assign(entry);
        columns = {};
        fields.clear();
        m_reader->readFields(m_entry, fields);
        return m_reader->read(m_entry, columns);
    }
    std::string field(std::string_view name) const {
        const std::string_view* const value = fields.find(name);
        return value == nullptr ? "(none)" : std::string(*value);
    }
    std::string_view reason() const { return m_reader->reason(); }
    const EntryFormat& format() const { return *m_format; }

    EntryColumns columns;
    EntryFields fields;

private:
    const std::shared_ptr<const EntryFormat> m_format;
    const std::unique_ptr<EntryFormat::Reader> m_reader;
    std::string m_entry;
};

} // namespace

TEST_F(Records, HaveTheColumnsOfTheAccountingLog) {
    EXPECT_EQ(format().recordLength(), sizeof(utmpx));
    utmpx record = login();
    record.ut_exit.e_termination = -1;
    record.ut_exit.e_exit = 255;
    ASSERT_TRUE(read(record));
    EXPECT_TRUE(columns.hasTime && columns.hasYear);
    EXPECT_EQ(columns.time.seconds(), 1795341600);
    EXPECT_EQ(columns.offset, 0);
    EXPECT_EQ(columns.system, "");
    EXPECT_EQ(columns.source, "pts/0");
    EXPECT_EQ(columns.type, "User process");
    EXPECT_EQ(columns.entryClass, "");
    EXPECT_EQ(columns.description,
              "user = anna; id = ts/0; pid = 412; term status = -1; exit status = 255");
}

TEST_F(Records, HaveFields) {
    ASSERT_TRUE(read(login()));
    EXPECT_EQ(field("type"), "USER_PROCESS");
    EXPECT_EQ(field("user"), "anna");
    EXPECT_EQ(field("line"), "pts/0");
    EXPECT_EQ(field("id"), "ts/0");
    EXPECT_EQ(field("host"), "client.example.com");
    EXPECT_EQ(field("address"), "203.0.113.7");
    EXPECT_EQ(field("pid"), "412");
    EXPECT_EQ(field("session"), "77");
    EXPECT_EQ(field("termination"), "0");
    EXPECT_EQ(field("exit"), "0");
    EXPECT_EQ(field("runlevel"), "(none)");
}

TEST_F(Records, HaveIpV6Addresses) {
    utmpx record = login();
    ASSERT_EQ(inet_pton(AF_INET6, "2001:db8::7", record.ut_addr_v6), 1);
    ASSERT_TRUE(read(record));
    EXPECT_EQ(field("address"), "2001:db8::7");
    std::memset(record.ut_addr_v6, 0, sizeof record.ut_addr_v6);
    record.ut_host[0] = '\0';
    ASSERT_TRUE(read(record));
    EXPECT_EQ(field("address"), "(none)");
    EXPECT_EQ(field("host"), "(none)");
}

TEST_F(Records, NameTheTypes) {
    const std::pair<short, const char*> types[] = {
        {BOOT_TIME, "System boot time"}, {RUN_LVL, "Run level"},
        {NEW_TIME, "New time"},          {OLD_TIME, "Old time"},
        {INIT_PROCESS, "init process"},  {LOGIN_PROCESS, "getty waiting"},
        {USER_PROCESS, "User process"},  {DEAD_PROCESS, "Zombie process"},
        {EMPTY, "Unused space"},         {9, "Accounting"}};
    for (const auto& [type, text] : types) {
        utmpx record = login();
        record.ut_type = type;
        ASSERT_TRUE(read(record)) << text;
        EXPECT_EQ(columns.type, text);
    }
}

TEST_F(Records, HaveTheRunLevel) {
    utmpx record = login();
    record.ut_type = RUN_LVL;
    record.ut_pid = '5' + 256 * 'N';
    ASSERT_TRUE(read(record));
    EXPECT_EQ(field("runlevel"), "5");
    record.ut_pid = 0;
    ASSERT_TRUE(read(record));
    EXPECT_EQ(field("runlevel"), "(none)");
}

TEST_F(Records, MayHaveFieldsWithoutATerminator) {
    utmpx record = login();
    std::memset(record.ut_user, 'u', sizeof record.ut_user);
    std::memset(record.ut_line, 'l', sizeof record.ut_line);
    std::memset(record.ut_host, 'h', sizeof record.ut_host);
    record.ut_pid = INT32_MIN;
    record.ut_exit.e_termination = record.ut_exit.e_exit = INT16_MIN;
    ASSERT_TRUE(read(record));
    EXPECT_EQ(columns.source, std::string(sizeof record.ut_line, 'l'));
    EXPECT_EQ(field("host"), std::string(sizeof record.ut_host, 'h'));
    EXPECT_EQ(columns.description, "user = " + std::string(sizeof record.ut_user, 'u') +
                                       "; id = ts/0; pid = -2147483648; term status = -32768; "
                                       "exit status = -32768");
}

TEST_F(Records, AreRejectedWithTheReason) {
    utmpx record = login();
    for (const short type : {short{10}, short{-1}, short{INT16_MAX}}) {
        record.ut_type = type;
        EXPECT_FALSE(read(record));
        EXPECT_EQ(reason(), "the type of the login record is not one of the known ones");
        EXPECT_TRUE(fields.all().empty());
    }
    EXPECT_FALSE(read(utmpx{}));
    EXPECT_EQ(reason(), "the login record has no time");
    record = login();
    record.ut_tv.tv_sec = -1;
    EXPECT_FALSE(read(record));
    EXPECT_FALSE(read("too short"));
    EXPECT_EQ(reason(), "it is not a whole login record");
    EXPECT_FALSE(read(std::string(sizeof(utmpx), '\xff')));
    EXPECT_TRUE(read(login()));
}

TEST(WtmpFormat, HasNoPattern) {
    FormatDescription description;
    description.patterns = {".*"};
    const auto format = WtmpFormat::make(description);
    ASSERT_FALSE(format);
    EXPECT_EQ(format.error().field, "format");
}

#include "tables/zrm_rmmonlog_base.h"

#include "base/TraceScope.h"

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmmonlog_base.cpp"};

using Row = zrm_rmmonlog_data_t;

constexpr TableColumn columns[] = {
    {"ORIGINNODE", "originnode", COLUMN_CHARACTER, offsetof(Row, originnode),
     sizeof(Row::originnode)},
    {"LOGPATH", "logpath", COLUMN_CHARACTER, offsetof(Row, logpath), sizeof(Row::logpath)},
    {"LOGNAME", "logname", COLUMN_CHARACTER, offsetof(Row, logname), sizeof(Row::logname)},
    {"LOGTYPE", "logtype", COLUMN_CHARACTER, offsetof(Row, logtype), sizeof(Row::logtype)},
    {"MONSTATUS", "monstatus", COLUMN_CHARACTER, offsetof(Row, monstatus), sizeof(Row::monstatus)},
    {"MONTIME", "montime", COLUMN_CHARACTER, offsetof(Row, montime), sizeof(Row::montime)},
    {"NUMEVENTS", "numevents", COLUMN_INTEGER, offsetof(Row, numevents), sizeof(Row::numevents)},
    {"NUMERRORS", "numerrors", COLUMN_INTEGER, offsetof(Row, numerrors), sizeof(Row::numerrors)},
    {"LOGSIZE", "logsize", COLUMN_INTEGER, offsetof(Row, logsize), sizeof(Row::logsize)},
    {"LOGMODDATE", "logmoddate", COLUMN_CHARACTER, offsetof(Row, logmoddate),
     sizeof(Row::logmoddate)},
    {"DEBUGMODE", "debugmode", COLUMN_CHARACTER, offsetof(Row, debugmode), sizeof(Row::debugmode)},
    {"FORMATTER", "formatter", COLUMN_CHARACTER, offsetof(Row, formatter), sizeof(Row::formatter)},
    {"TIMESTAMP", "timestamp", COLUMN_CHARACTER, offsetof(Row, timestamp), sizeof(Row::timestamp)},
    {"SAMPLENO", "sampleno", COLUMN_INTEGER, offsetof(Row, sampleno), sizeof(Row::sampleno)},
    {"ROWNO", "rowno", COLUMN_INTEGER, offsetof(Row, rowno), sizeof(Row::rowno)},
    {"ULOGPATH", "ulogpath", COLUMN_UTF8, offsetof(Row, ulogpath), sizeof(Row::ulogpath)},
    {"ULOGNAME", "ulogname", COLUMN_UTF8, offsetof(Row, ulogname), sizeof(Row::ulogname)},
};

constexpr TableDescription table{"zrm_rmmonlog_base", columns, sizeof(Row), 5};

static_assert(table.coversRow());

} // namespace

zrm_rmmonlog_base::zrm_rmmonlog_base(RequestDetail* detail, ContextInfo* context,
                                     TableManager* manager)
    : TableRequest(detail, context, manager, table) {}

unsigned zrm_rmmonlog_base::AddData(zrm_rmmonlog_data_t* rows, int count) {
    TraceScope trace(anchor);
    return trace.result(addRows(reinterpret_cast<char*>(rows), count));
}

} // namespace zrm

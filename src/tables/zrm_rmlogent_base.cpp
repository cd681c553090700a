#include "tables/zrm_rmlogent_base.h"

#include "base/TraceScope.h"

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmlogent_base.cpp"};

using Row = zrm_rmlogent_data_t;

constexpr TableColumn columns[] = {
    {"ORIGINNODE", "originnode", COLUMN_CHARACTER, offsetof(Row, originnode),
     sizeof(Row::originnode)},
    {"LOGPATH", "logpath", COLUMN_CHARACTER, offsetof(Row, logpath), sizeof(Row::logpath)},
    {"LOGNAME", "logname", COLUMN_CHARACTER, offsetof(Row, logname), sizeof(Row::logname)},
    {"ENTRYTIME", "entrytime", COLUMN_CHARACTER, offsetof(Row, entrytime), sizeof(Row::entrytime)},
    {"ENTRYSYS", "entrysys", COLUMN_CHARACTER, offsetof(Row, entrysys), sizeof(Row::entrysys)},
    {"ENTRYSRC", "entrysrc", COLUMN_CHARACTER, offsetof(Row, entrysrc), sizeof(Row::entrysrc)},
    {"ENTRYTYPE", "entrytype", COLUMN_CHARACTER, offsetof(Row, entrytype), sizeof(Row::entrytype)},
    {"ENTRYCLASS", "entryclass", COLUMN_CHARACTER, offsetof(Row, entryclass),
     sizeof(Row::entryclass)},
    {"ENTRYDESC", "entrydesc", COLUMN_CHARACTER, offsetof(Row, entrydesc), sizeof(Row::entrydesc)},
    {"FREQTHRESH", "freqthresh", COLUMN_INTEGER, offsetof(Row, freqthresh),
     sizeof(Row::freqthresh)},
    {"PERIODTHRS", "periodthrs", COLUMN_INTEGER, offsetof(Row, periodthrs),
     sizeof(Row::periodthrs)},
    {"TIMESTAMP", "timestamp", COLUMN_CHARACTER, offsetof(Row, timestamp), sizeof(Row::timestamp)},
    {"SAMPLENO", "sampleno", COLUMN_INTEGER, offsetof(Row, sampleno), sizeof(Row::sampleno)},
    {"ROWNO", "rowno", COLUMN_INTEGER, offsetof(Row, rowno), sizeof(Row::rowno)},
    {"ULOGPATH", "ulogpath", COLUMN_UTF8, offsetof(Row, ulogpath), sizeof(Row::ulogpath)},
    {"ULOGNAME", "ulogname", COLUMN_UTF8, offsetof(Row, ulogname), sizeof(Row::ulogname)},
    {"UENTRYSRC", "uentrysrc", COLUMN_UTF8, offsetof(Row, uentrysrc), sizeof(Row::uentrysrc)},
    {"UENTRYDESC", "uentrydesc", COLUMN_UTF8, offsetof(Row, uentrydesc), sizeof(Row::uentrydesc)},
};

constexpr TableDescription table{"zrm_rmlogent_base", columns, sizeof(Row), 20};

static_assert(table.coversRow());

} // namespace

zrm_rmlogent_base::zrm_rmlogent_base(RequestDetail* detail, ContextInfo* context,
                                     TableManager* manager)
    : TableRequest(detail, context, manager, table) {}

bool zrm_rmlogent_base::isTraced() {
    return TableRequest::isTraced() || tracesRows(anchor);
}

unsigned zrm_rmlogent_base::AddData(zrm_rmlogent_data_t* rows, int count) {
    TraceScope trace(anchor);
    return trace.result(addRows(reinterpret_cast<char*>(rows), count));
}

} // namespace zrm

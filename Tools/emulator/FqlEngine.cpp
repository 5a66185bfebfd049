#include "FqlEngine.h"

#include <sqlite3.h>

#include "FqlCatalog.h"
#include "FqlChecker.h"
#include "FqlParser.h"
#include "FqlTranslator.h"
#include "SqliteDatabase.h"
#include "SqliteStatement.h"

namespace emu {

namespace {

ServiceError unknownError() { return ServiceError{1, "An unknown error occurred"}; }

std::optional<std::string> optionalText(const SqliteStatement& row, int column) {
    if (row.isNull(column)) return std::nullopt;
    return row.getText(column);
}

}  // namespace

Status FqlEngine::compile(std::int64_t viewer, std::int64_t now, const std::string& query, FqlPlan& plan) {
    std::unique_ptr<FqlSelect> select;
    if (Status s = FqlParser::parse(query, select)) return s;
    FqlChecker checker(FqlCatalog::instance(), viewer);
    if (Status s = checker.check(*select)) return s;
    plan = FqlTranslator(viewer, now).translate(*select);
    return std::nullopt;
}

Status FqlEngine::run(std::int64_t viewer, std::int64_t now, const std::string& query, XmlNode& root) {
    FqlPlan plan;
    if (Status s = compile(viewer, now, query, plan)) return s;
    return execute(plan, root);
}

Status FqlEngine::execute(const FqlPlan& plan, XmlNode& root) {
    std::string error;
    sqlite3_stmt* raw = db_.prepareCached(plan.sql, error);
    if (!raw || !sqlite3_stmt_readonly(raw)) return unknownError();
    SqliteStatement row(raw);
    for (std::size_t i = 0; i < plan.params.size(); ++i) row.bind(static_cast<int>(i + 1), plan.params[i]);
    root.list = true;
    while (row.step()) {
        XmlNode& element = root.add(plan.rowElement);
        element.children.reserve(plan.outputs.size());
        for (const FqlOutput& out : plan.outputs) {
            switch (out.kind) {
                case FqlOutput::Kind::Scalar:
                    if (row.isNull(out.column)) element.addNil(out.element);
                    else element.add(out.element, row.getText(out.column));
                    break;
                case FqlOutput::Kind::Struct: {
                    bool allNull = true;
                    for (std::size_t f = 0; f < out.fields.size(); ++f)
                        if (!row.isNull(out.column + static_cast<int>(f))) allNull = false;
                    if (allNull) {
                        element.addNil(out.element);
                        break;
                    }
                    XmlNode& s = element.add(out.element);
                    for (std::size_t f = 0; f < out.fields.size(); ++f) {
                        const int c = out.column + static_cast<int>(f);
                        if (row.isNull(c)) s.addNil(out.fields[f]);
                        else s.add(out.fields[f], row.getText(c));
                    }
                    break;
                }
                case FqlOutput::Kind::UidList: {
                    if (row.isNull(out.column)) {
                        element.addNil(out.element);
                        break;
                    }
                    XmlNode& list = element.addList(out.element);
                    const std::string uids = row.getText(out.column);
                    std::size_t start = 0;
                    while (start < uids.size()) {
                        std::size_t comma = uids.find(',', start);
                        if (comma == std::string::npos) comma = uids.size();
                        if (comma > start) list.add("uid", uids.substr(start, comma - start));
                        start = comma + 1;
                    }
                    break;
                }
                case FqlOutput::Kind::Attachment: {
                    XmlNode& attachment = element.add(out.element);
                    const int c = out.column;
                    if (!attachments_.write(row.getText(c), optionalText(row, c + 1), optionalText(row, c + 2),
                                            optionalText(row, c + 3), optionalText(row, c + 4), attachment, error))
                        return unknownError();
                    break;
                }
            }
        }
    }
    if (!row.ok()) return unknownError();
    return std::nullopt;
}

}  // namespace emu

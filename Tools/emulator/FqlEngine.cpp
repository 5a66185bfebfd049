#include "FqlEngine.h"

#include <sqlite3.h>

#include "FqlCatalog.h"
#include "FqlChecker.h"
#include "FqlParser.h"
#include "FqlTranslator.h"
#include "SqliteDatabase.h"
#include "SqliteStatement.h"
#include "XmlTreeWriter.h"

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

Status FqlEngine::run(std::int64_t viewer, std::int64_t now, const std::string& query, AnswerWriter& out) {
    FqlPlan plan;
    if (Status s = compile(viewer, now, query, plan)) return s;
    return execute(plan, out);
}

Status FqlEngine::run(std::int64_t viewer, std::int64_t now, const std::string& query, XmlNode& root) {
    root.list = true;
    XmlTreeWriter rows(root);
    return run(viewer, now, query, rows);
}

Status FqlEngine::execute(const FqlPlan& plan, AnswerWriter& out) {
    std::string error;
    if (!plan.countSql.empty()) {
        sqlite3_stmt* raw = db_.prepareCached(plan.countSql, error);
        if (!raw || !sqlite3_stmt_readonly(raw)) return unknownError();
        SqliteStatement count(raw);
        for (std::size_t i = 0; i < plan.params.size(); ++i) count.bind(static_cast<int>(i + 1), plan.params[i]);
        if (!count.step()) return unknownError();
        for (std::int64_t n = count.getInt(0); n > 0; --n) {
            out.open(plan.rowElement, false);
            for (std::size_t i = 0; i < plan.outputs.size(); ++i) out.leaf(plan.outputs[i].element, plan.constantRow[i]);
            out.close();
        }
        return std::nullopt;
    }
    sqlite3_stmt* raw = db_.prepareCached(plan.sql, error);
    if (!raw || !sqlite3_stmt_readonly(raw)) return unknownError();
    SqliteStatement row(raw);
    for (std::size_t i = 0; i < plan.params.size(); ++i) row.bind(static_cast<int>(i + 1), plan.params[i]);
    // Each row goes from the step loop straight into the answer text: no row is kept.
    while (row.step()) {
        out.open(plan.rowElement, false);
        for (const FqlOutput& output : plan.outputs) {
            switch (output.kind) {
                case FqlOutput::Kind::Scalar:
                    if (row.isNull(output.column)) out.nil(output.element);
                    else out.leaf(output.element, row.textView(output.column));
                    break;
                case FqlOutput::Kind::Struct: {
                    bool allNull = true;
                    for (std::size_t f = 0; f < output.fields.size(); ++f)
                        if (!row.isNull(output.column + static_cast<int>(f))) allNull = false;
                    if (allNull) {
                        out.nil(output.element);
                        break;
                    }
                    out.open(output.element, false);
                    for (std::size_t f = 0; f < output.fields.size(); ++f) {
                        const int c = output.column + static_cast<int>(f);
                        if (row.isNull(c)) out.nil(output.fields[f]);
                        else out.leaf(output.fields[f], row.textView(c));
                    }
                    out.close();
                    break;
                }
                case FqlOutput::Kind::UidList: {
                    if (row.isNull(output.column)) {
                        out.nil(output.element);
                        break;
                    }
                    out.open(output.element, true);
                    const std::string_view uids = row.textView(output.column);
                    std::size_t start = 0;
                    while (start < uids.size()) {
                        std::size_t comma = uids.find(',', start);
                        if (comma == std::string_view::npos) comma = uids.size();
                        if (comma > start) out.leaf("uid", uids.substr(start, comma - start));
                        start = comma + 1;
                    }
                    out.close();
                    break;
                }
                case FqlOutput::Kind::Attachment: {
                    XmlNode attachment(output.element);
                    const int c = output.column;
                    if (!attachments_.write(row.getText(c), optionalText(row, c + 1), optionalText(row, c + 2),
                                            optionalText(row, c + 3), optionalText(row, c + 4), attachment, error))
                        return unknownError();
                    out.write(attachment);
                    break;
                }
            }
        }
        out.close();
    }
    if (!row.ok()) return unknownError();
    return std::nullopt;
}

}  // namespace emu

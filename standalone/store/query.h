// SPDX-License-Identifier: Apache-2.0
//
// Statements with their parameters, and rows as values. For this folder's sources.
//
// Why so        A record's Mapping says once which column holds which member; reading, inserting and updating follow
//               from it. Members are bound before the statement runs: SOCI's dynamic rows give count(*) another type on
//               each engine, and take longer.
//               Parameters are bound in the order of their placeholders, and a placeholder stands in a text once: the
//               engines count one that is repeated in different ways.
#pragma once

#include <optional>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>
#include <vector>

#include <soci/soci.h>

namespace soci {

// Booleans and enumerations are stored as integers.
template <typename Value>
struct type_conversion<Value, std::enable_if_t<std::is_enum_v<Value> || std::is_same_v<Value, bool>>> {
    using base_type = int;

    static void from_base(int stored, indicator /*columns are never null*/, Value& value) {
        value = static_cast<Value>(stored);
    }
    static void to_base(const Value& value, int& stored, indicator& state) {
        stored = static_cast<int>(value);
        state = i_ok;
    }
};

}  // namespace soci

namespace lookhaven::store {

// How a record is stored; each record's source has a specialisation with
//   kTable                  the table
//   kColumns                "id, name, …", the one that Update looks for first
//   Members(auto& record)   std::tie of the members in the columns' order; a pair or tuple needs none
template <typename Record>
struct Mapping;

// The values of a row, one for each column, behind references.
template <typename Row>
auto MembersOf(Row& row) {
    using Plain = std::remove_const_t<Row>;
    if constexpr (requires { Mapping<Plain>::Members(row); }) {
        return Mapping<Plain>::Members(row);
    } else if constexpr (requires { std::tuple_size<Plain>::value; }) {
        return std::apply([](auto&... parts) { return std::tuple_cat(MembersOf(parts)...); }, row);
    } else {
        return std::tie(row);
    }
}

// PostgreSQL takes three round trips for a statement that may run again, and one for another.
constexpr auto kOnce = soci::details::st_one_time_query;
constexpr auto kRepeatedly = soci::details::st_repeatable_query;

// A statement that runs with what the parameters, which are borrowed, hold at that time.
template <typename... Parameter>
soci::statement Prepare(soci::session& sql, soci::details::statement_type runs, const std::string& text,
                        const Parameter&... parameters) {
    soci::statement statement(sql);
    (statement.exchange(soci::use(parameters)), ...);
    statement.alloc();
    statement.prepare(text, runs);
    statement.define_and_bind();
    return statement;
}

// Runs the statement; returns the number of rows changed.
int Run(soci::statement& statement);

template <typename... Parameter>
int Execute(soci::session& sql, const std::string& text, const Parameter&... parameters) {
    soci::statement statement = Prepare(sql, kOnce, text, parameters...);
    return Run(statement);
}

// A question whose answer is rows. text: all of it, or for a mapped record what follows
// "select … from <table> ", unless it begins with "select" itself. Parameters as in Prepare.
template <typename Row>
class Query {
  public:
    template <typename... Parameter>
    Query(soci::session& sql, soci::details::statement_type runs, const std::string& text,
          const Parameter&... parameters)
        : statement_(sql) {
        std::apply([this](auto&... members) { (statement_.exchange(soci::into(members)), ...); }, MembersOf(row_));
        (statement_.exchange(soci::use(parameters)), ...);
        statement_.alloc();
        statement_.prepare(Whole(text), runs);
        statement_.define_and_bind();
    }
    Query(const Query&) = delete;
    Query& operator=(const Query&) = delete;

    // Calls visit(const Row&) as the rows come; the row is borrowed for the call.
    template <typename Visit>
    void ForEach(Visit&& visit) {
        statement_.execute();
        while (statement_.fetch()) {
            visit(std::as_const(row_));
        }
    }

    std::optional<Row> First() { return statement_.execute(true) ? std::optional(std::move(row_)) : std::nullopt; }

  private:
    static std::string Whole(const std::string& text) {
        if constexpr (requires { Mapping<Row>::kTable; }) {
            if (text.starts_with("select ")) {
                return text;
            }
            return std::string("select ") + Mapping<Row>::kColumns + " from " + Mapping<Row>::kTable + " " + text;
        } else {
            return text;
        }
    }

    Row row_{};
    soci::statement statement_;
};

template <typename Row, typename... Parameter>
std::optional<Row> FetchOne(soci::session& sql, const std::string& text, const Parameter&... parameters) {
    return Query<Row>(sql, kOnce, text, parameters...).First();
}

template <typename Row, typename Rows = std::vector<Row>, typename... Parameter>
Rows FetchAll(soci::session& sql, const std::string& text, const Parameter&... parameters) {
    Rows rows;
    Query<Row>(sql, kOnce, text, parameters...).ForEach([&rows](const Row& row) { rows.insert(rows.end(), row); });
    return rows;
}

// Whether the query finds an id.
template <typename... Parameter>
bool Exists(soci::session& sql, const std::string& text, const Parameter&... parameters) {
    return FetchOne<int>(sql, text, parameters...).has_value();
}

// An array in PostgreSQL's text form.
std::string ArrayText(const auto& numbers) {
    std::string text = "{";
    for (const auto number : numbers) {
        text += (text.size() > 1 ? "," : "") + std::to_string(number);
    }
    return text + "}";
}

// "insert into <table> (a, b) values (:a, :b)" and "update <table> set b = :b where a = :a".
std::string InsertText(const std::string& table, const std::string& columns);
std::string UpdateText(const std::string& table, const std::string& columns);

// Inserts what the row holds whenever it runs.
template <typename Row>
soci::statement PrepareInsert(soci::session& sql, soci::details::statement_type runs, const Row& row) {
    return std::apply(
        [&](const auto&... members) {
            return Prepare(sql, runs, InsertText(Mapping<Row>::kTable, Mapping<Row>::kColumns), members...);
        },
        MembersOf(row));
}

template <typename Row>
void Insert(soci::session& sql, const Row& row) {
    soci::statement insert = PrepareInsert(sql, kOnce, row);
    Run(insert);
}

// Replaces all columns of the row whose first one is the same.
template <typename Row>
void Update(soci::session& sql, const Row& row) {
    std::apply(
        [&](const auto& key, const auto&... members) {
            Execute(sql, UpdateText(Mapping<Row>::kTable, Mapping<Row>::kColumns), members..., key);
        },
        MembersOf(row));
}

}  // namespace lookhaven::store

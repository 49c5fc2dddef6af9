// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/event_json.h"

#include <algorithm>
#include <map>

#include "standalone/store/kept_events.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

Json::Value LinesOf(const std::string& text) {
    Json::Value lines(Json::arrayValue);
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t end = std::min(text.find('\n', at), text.size());
        lines.append(text.substr(at, end - at));
        at = end + 1;
    }
    return lines;
}

Json::Value PiecesOf(const std::vector<std::vector<std::string>>& lines) {
    Json::Value json(Json::arrayValue);
    for (const std::vector<std::string>& pieces : lines) {
        Json::Value& line = json.append(Json::arrayValue);
        for (const std::string& piece : pieces) {
            line.append(piece);
        }
    }
    return json;
}

void AddKeepRecord(Json::Value& json, const store::KeepRecord& record) {
    json["note"] = record.note;
    json["kept_by"] = record.keeper;
    json["kept"] = Json::Int64{record.kept_s};
}

}  // namespace

Json::Value Describe(const store::Mark& mark, const store::TextQuery& words) {
    Json::Value json;
    json["id"] = mark.id;
    json["kind"] = base::NameOf(store::MarkKindNames(), mark.kind);
    json["camera_id"] = mark.camera_id;
    json["time"] = Json::Int64{mark.moment_s};
    json["start"] = Json::Int64{mark.start_s};
    json["stop"] = Json::Int64{mark.end_s};
    json["state"] = store::NameOf(mark.state);
    json["reported_by"] = mark.reporter.name;
    json["text"] = LinesOf(mark.text);
    if (!words.IsEmpty()) {
        json["found"] = PiecesOf(words.Mark(mark.text));
    }
    return json;
}

// With the same member names as the search of recorded events.
Json::Value Describe(const store::Event& event) {
    Json::Value json;
    json["id"] = event.id;
    json["kind"] = "event";
    json["camera_id"] = event.camera_id;
    json["start"] = Json::Int64{event.start_s};
    json["stop"] = Json::Int64{event.end_s};
    json["frame_count"] = event.frame_count;
    json["record_type"] = event.reason;
    json["is_recording"] = event.recording;
    json["archived"] = event.kept;
    return json;
}

Json::Value DescribeWithKeeping(store::Store& records, const store::Mark& mark) {
    Json::Value json = Describe(mark);
    const std::vector<store::Event> recordings = RecordingsOf(records, mark);
    json["archived"] = !recordings.empty() && std::ranges::all_of(recordings, &store::Event::kept);
    return json;
}

Json::Value DescribeWithKeeping(store::Store& records, const store::Event& event) {
    Json::Value json = Describe(event);
    if (const auto record = event.kept ? store::KeptEvents(records).Find(event.id) : std::nullopt) {
        AddKeepRecord(json, *record);
    }
    return json;
}

Json::Value DescribeWithKeeping(store::Store& records, const std::vector<store::Event>& events) {
    Json::Value json(Json::arrayValue);
    if (events.empty()) {
        return json;
    }
    const auto [first, last] = std::ranges::minmax(events, {}, &store::Event::id);
    const std::map<int, store::KeepRecord> keep_records = store::KeptEvents(records).FindBetween(first.id, last.id);
    for (const store::Event& event : events) {
        Json::Value& each = json.append(Describe(event));
        if (const auto record = keep_records.find(event.id); event.kept && record != keep_records.end()) {
            AddKeepRecord(each, record->second);
        }
    }
    return json;
}

}  // namespace lookhaven::api

#include "record_output.h"

#include "valid_utf8.h"

#include "logformat/record_text.h"

namespace orvane::logcat {
namespace {

void AppendMember(std::string &json, std::string_view name, std::optional<std::string_view> value) {
  if (!value) return;
  json += ",\"";
  json += name;
  json += "\":\"";
  AppendJsonEscaped(json, *value);
  json += '"';
}

} // namespace

bool AppendRecordLine(std::string &out, std::string &scratch, const EventRecord &record,
                      const AddedMembers &added) {
  scratch.clear();
  AppendRecordJson(scratch, record);
  scratch.pop_back(); // the added members go inside the record's closing brace
  const bool not_utf8 = AppendValidUtf8(out, scratch) != 0;
  scratch.clear();
  AppendMember(scratch, "file", added.file);
  AppendMember(scratch, "key_game_id", added.key_game_id);
  scratch += "}\n";
  AppendValidUtf8(out, scratch);
  return not_utf8;
}

std::string CheckSummary(std::string_view name, const LogCounts &counts) {
  std::string line(name);
  line += ": " + std::to_string(counts.records) + " records, ";
  line += std::to_string(counts.bad_lines) + " bad lines, ";
  line += std::to_string(counts.not_utf8) + " records with bytes not UTF-8\n";
  return line;
}

} // namespace orvane::logcat

// What the keys of a report went through, and how much they tell, for people and as JSON.
#pragma once

#include <vector>

#include "platform/plist/json_writer.h"
#include "tools/tallyctl/report/identifiability.h"
#include "tools/tallyctl/report/key_stories.h"
#include "tools/tallyctl/report/other_logs.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

void printKeyStories(Terminal& out, const std::vector<KeyStory>& stories);
// {"keys": [{"key", "kind", "recorded", "reported", "rule", "reason"}]}
void writeKeyStories(JsonWriter& json, const std::vector<KeyStory>& stories);

void printIdentifiability(Terminal& out, const Identifiability& found);
// {"keys": [{"key", "kind", "values", "bits", "followsValues"}], "outside": [name]}
void writeIdentifiability(JsonWriter& json, const Identifiability& found);

// Whether submission is on, and a line for each other log.
void printOtherLogs(Terminal& out, const std::vector<OtherLog>& logs);

}  // namespace tbdaily

#pragma once

namespace orva {

// Whether what is written to the file goes to systemd's journal, as systemd.exec(5) says of
// JOURNAL_STREAM.
bool IsJournal(int file);

// LOG_PERROR for a program that runs in the foreground, 0 where standard error is the journal: each
// line of the log would stand there twice.
int ForegroundLogOption();

}  // namespace orva

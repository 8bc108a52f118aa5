#pragma once
// The platform log: one line per message on standard error.
//
// When standard error is the stream of the journal (its device and inode are those of $JOURNAL_STREAM, see
// systemd.exec(5)), a line begins with a priority prefix "<3>" to "<7>" as in sd-daemon(3). Otherwise it reads
// "14:05:09.123 E/TAG text". The least priority that is written is that of $DLOG_LEVEL: "error", "warn", "info",
// "debug" or "verbose"; "warn" when it is unset. Both are read once, with the first message.

enum log_priority {
    DLOG_VERBOSE = 2,
    DLOG_DEBUG = 3,
    DLOG_INFO = 4,
    DLOG_WARN = 5,
    DLOG_ERROR = 6,
    DLOG_FATAL = 7,
};

// Formats a message like printf(3) and writes it in a single write(2), so that lines of several threads or processes do
// not mix. A line break at the very end is dropped; any other control character is written as an escape sequence such
// as \n or \x1b, so that no message can forge a line or drive a terminal. Colours ("\e[...m") pass through to a
// terminal and are dropped elsewhere. Texts of more than about 4000 bytes are cut. A null tag counts as "". Returns the
// number of bytes written, 0 for a message below the threshold (or taken by a sink), -1 for a failed write or a null
// format. Any thread. errno is kept.
int __dlog_print(int priority, const char *tag, const char *format, ...) __attribute__((format(printf, 3, 4)));

// Gets each message in place of standard error, of every priority, as formatted, with its colours and line breaks. It
// runs on the thread that logs, one message at a time; `tag` and `text` are valid during the call.
typedef void (*dlog_sink)(int priority, const char *tag, const char *text, void *data);

// Sets the sink of this process, null for none. Once it returns, the earlier sink runs no more. Any thread; a sink may
// log and may call it.
void dlog_set_sink(dlog_sink sink, void *data);

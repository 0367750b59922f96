// What `orvane-logcat --help` prints: the manual page of the tool.
#pragma once

#include <string_view>

namespace orvane::logcat {

inline constexpr std::string_view kHelpText = R"(NAME
    orvane-logcat - read OrvaneSDK analytics logs as JSON Lines

SYNOPSIS
    orvane-logcat [OPTION]... [FILE | FOLDER | -]...

DESCRIPTION
    Reads the log files that games wrote through OrvaneSDK (one encrypted
    record per line) and writes each record to standard output as one JSON
    object per line, ready for jq, a database or an ingestion pipeline:

      {"user_id":"...","game_id":"...","type":"...","time":"...","extra":"..."}

    FILE is a log such as Logs/GAME.log. A FOLDER reads every *.log file in
    it, sorted by name. "-" reads standard input. With no argument the tool
    reads standard input when it is a pipe or a file, and otherwise the
    folder the library writes to on this machine: $XDG_DATA_HOME/Orvane/Logs/
    (or ~/.local/share/Orvane/Logs/) on Linux, C:\Orvane\Logs\ on Windows.

KEYS
    A process encrypts the logs of every game under the key of the first
    game id it recorded, so one file can mix keys line by line. Each line is
    tried with the key of the file's own game id (its name without ".log"),
    then with the keys of the other *.log files in the same folder, then
    with each --key-game-id, and last with the key of an empty game id (a
    process whose first call had none). The first key that decrypts the
    line with valid padding and gives a record wins, and is tried first for
    the next line.

OUTPUT
    Each record keeps its stored form: the five members in the stored order,
    escaped as the library escapes them (" as \", \ as \\, bytes below 0x20
    as \b \f \n \r \t or \u00XX). Valid UTF-8 is written unchanged, so a
    record the library wrote is printed exactly as it was encrypted. A game
    may pass any bytes: each byte that is not part of valid UTF-8 is written
    as \u00XX, its Latin-1 reading (byte 0xE9 alone becomes \u00e9). Every
    line is therefore valid UTF-8 JSON, and since valid UTF-8 is never
    escaped, an escape from \u0080 to \u00ff always stands for that one
    stored byte.

OPTIONS
    --key-game-id ID
        Also try the key of game id ID (only its first 65 bytes count, as in
        the library). May be given more than once. Standard input has no
        file name and no folder, so it needs this option.
        Example: orvane-logcat --key-game-id launcher-hub Logs/

    --show-key
        Add "key_game_id": the game id whose key read the line.
        Example: orvane-logcat --show-key Logs/space-race.log

    --with-file
        Add "file": the name of the log the record comes from.
        Example: orvane-logcat --with-file Logs/

    --since TIME
        Only records at or after TIME, given as YYYY-MM-DDTHH:MM:SS (UTC,
        the record time's own form) or as a date alone, YYYY-MM-DD, naming
        a real day and time. Times are compared as text.
        Example: orvane-logcat --since 2024-05-17T08:00:00 Logs/

    --until TIME
        Only records at or before TIME, in the same forms; a date alone
        takes in that whole day. A window that starts after it ends is a
        usage error.
        Example: orvane-logcat --until 2024-05-17 Logs/

    --type TYPE
        Only records of TYPE: INIT, ENTER, EXIT or SPECIAL. May be given
        more than once; a record of any type given passes.
        Example: orvane-logcat --type ENTER --type EXIT Logs/

    --check
        Print no records; print for each file "FILE: N records, M bad
        lines, K records with bytes not UTF-8" instead. Filters narrow the
        records counted. A log whose first record is not INIT has lost its
        start: that line is reported as "FILE:LINE: first record is not
        INIT" and counted as bad. A last line without a line break that no
        key reads while a writer holds the log's lock is being appended: it
        is waited for, not reported; with no writer at work it is torn.
        Example: orvane-logcat --check Logs/

    --follow
        After the end of each file, keep reading lines as they are
        appended, like tail -f, until interrupted. A missing file is waited
        for, and *.log files that appear in a folder later are read too.
        A file cut shorter is read again from its start, and one replaced
        at its path (moved away and started again) is read to its end,
        then the new file from its start; both are noted on standard error.
        Filters apply as they do without --follow. Standard input is read to
        its end and not followed.
        Example: orvane-logcat --follow --type SPECIAL Logs/

    --version
        Print the version and exit.
        Example: orvane-logcat --version

    --help
        Print this text and exit.
        Example: orvane-logcat --help | less

    --
        Every later argument is a file or folder.
        Example: orvane-logcat -- -odd-name.log

DIAGNOSTICS
    Line breaks may be LF or CR LF; empty lines carry no record and are
    skipped. A line that is not lowercase hex of whole 16-byte blocks (one
    torn by a writer that died while writing it), that no key tried
    decrypts, or that decrypts but is not a JSON object with the five
    members is reported once on standard error as FILE:LINE: reason, and
    reading goes on with the next line. A file or folder that does not
    exist (unless --follow waits for it), cannot be opened, listed or read
    is reported with the system's reason ("FILE: cannot open: No such file or directory", "FOLDER: cannot
    list: Permission denied", "FILE: read error: ..."), and reading goes on
    with the next. Only regular files are read: anything else is reported
    as "FILE: is a FIFO, not a regular file; not read" (a character or
    block device, a socket, a folder). A line longer than any the library
    writes (64 MiB) is reported where it starts and skipped to its end; a
    file whose line memory cannot hold is reported ("FILE: out of memory;
    the rest of this file is not read"). A file reached by two paths is
    read once.

EXIT STATUS
    0   every line was a good record
    1   some lines were bad (with --check, also a first record not INIT)
    2   a usage error, or a file or folder that could not be found, opened,
        listed or read, or is not a regular file, in every mode, --check
        included; it outranks 1
)";

} // namespace orvane::logcat

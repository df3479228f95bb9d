# For ./run: sends the service one message of each kind, and shows where each ended, as found in the store,
# the outbox and the log. To be sourced; needs bash.

# wait_for COMMAND...: repeats the command until it succeeds, for ten seconds at most.
wait_for() {
    local tries
    for ((tries = 0; tries < 200; tries++)); do
        if "$@"; then
            return 0
        fi
        sleep 0.05
    done
    return 1
}

send() {
    printf '%s' "$1" >/dev/udp/127.0.0.1/9997
}

# in_log TEXT: prints the log's lines with that text; fails when there is none. Rotated files are part of the
# log.
in_log() {
    grep -hF -- "$1" "$log_directory"/Report*.log
}

# whole_log: prints the whole log, the oldest line first: the rotated files in the order of their numbers,
# then the live file.
whole_log() {
    local file number
    for file in "$log_directory"/Report_*.log; do
        number=${file##*_}
        printf '%s %s\n' "${number%.log}" "$file"
    done | sort -n | cut -d ' ' -f 2- | while read -r file; do
        cat "$file" 2>/dev/null || true # there may be no rotated file, or this one was just deleted
    done
    cat "$log_directory"/Report.log
}

# line_after MESSAGE TEXT: prints the first line of the log with that text after the line that logs the
# message's arrival. It reads the whole log, because the writer would fail if the reader stopped early. The
# texts are passed in the environment, because awk interprets escapes in -v.
line_after() {
    whole_log | message="Recv] $1" text=$2 awk \
        'seen && !found && index($0, ENVIRON["text"]) { print; found = 1 }
        index($0, ENVIRON["message"]) { seen = 1 }'
}

query() {
    sqlite3 -readonly -cmd '.timeout 5000' "$1" "$2" 2>/dev/null
}

# show TITLE MESSAGE
show() {
    printf '\n%s\n  sent  %s\n' "$1" "$2"
}

# found WHERE COMMAND...: waits until the command prints something, and shows it.
found() {
    local where=$1
    shift
    if wait_for found_quietly "$@"; then
        "$@" | tail -n 1 | sed "s/^/  $where  /"
    else
        echo "  $where  NOT FOUND within ten seconds"
        missing=$((missing + 1))
    fi
}

found_quietly() {
    [ -n "$("$@" 2>/dev/null)" ]
}

# can_be_sent_back TEXT: whether the text can be used unchanged in JSON, in a format string (the service logs
# each message as one) and in an SQL literal.
can_be_sent_back() {
    [[ $1 != *[\"\\%\'[:cntrl:]]* ]]
}

# send_and_show DATA_DIRECTORY STARTED: true when each message ended where it belongs. STARTED is "yes" when
# this script started the service, so that no other program has sent anything. Otherwise a line that does not
# name its message may belong to another program's message.
send_and_show() {
    local store=$1/database/Report.db outbox=$1/database/MetrikOutbox.db
    local log_directory=$1/log/metrik
    local id message missing=0 site="log "
    [ "$2" = yes ] || site="log  (a line of that site; it may be another program's message that caused it)"
    id=$(date +%s%N)

    message='{"eventID":"DEMO|'$id'","value":{"page":"start"},"createTime":'${id:0:13}'}'
    show "A report for the local store" "$message"
    send "$message"
    found "row " query "$store" "select id, eventID, value, createTime, pType, extData3, extData4 from OperLog
        where eventID='DEMO|$id'"
    found "log " in_log "$message"

    # An event that a collector accepted has left the outbox. The module's counter shows that it was there.
    local before
    before=$(query "$outbox" "select last_sequence from module where module_id='A759'")
    message='{"eventID":"A759|'$id'","value":{"page":"start"},"createTime":'${id:0:10}'}'
    show "A report for analytics" "$message"
    send "$message"
    found "event" query "$outbox" "select 'number ' || last_sequence || ' of module A759, ' || coalesce(
            (select 'waiting as ' || uuid || ': ' || payload from event where event_id='A759|$id'),
            'uploaded already')
        from module where module_id='A759' and last_sequence > ${before:-0}"

    message='{"msgType":"init","exdata":{"moduleID":"DEMO'$id'","moduleVersion":"1","moduleName":"demo"}}'
    show "A module that announces itself" "$message"
    send "$message"
    found "log " in_log "Add metrik module :DEMO$id"

    # Sends the user and version of the row above, because the real values must not change.
    local user version
    user=$(query "$store" "select extData4 from OperLog where eventID='DEMO|$id'")
    version=$(query "$store" "select extData3 from OperLog where eventID='DEMO|$id'")
    if [ -n "$user" ] && can_be_sent_back "$user$version"; then
        message='{"msgType":"updateOpenID","exdata":{"openID":"'$user'",'
        message+='"hublinkVersion":"'$version'","demo":"'$id'"}}'
        show "The signed-in user" "$message"
        send "$message"
        found "$site" line_after "$message" "[App/ReportServer:111 SetBaseInfo] SetBaseInfo $user-$version"
    else
        printf '\n%s %s\n' "The signed-in user: left out; there is no row above," \
            "or its user and version cannot be sent."
    fi

    message='{"eventID":"DEMO|'$id'", this is no JSON'
    show "A report that cannot be parsed" "$message"
    send "$message"
    found "$site" line_after "$message" "[App/ReportServer:123 JsonToStruct]"

    echo
    if [ "$missing" -gt 0 ]; then
        echo "$missing of the messages did not end where they belong; the log is in $log_directory."
        return 1
    fi
    echo "Each message ended where it belongs."
}

// Runs statements in a current ClickHouse, for engines.py: a line of input is {"sql": ...}; a line of output
// is {"result": ...} or {"error": ...}.
const readline = require('readline');
const { Session } = require('chdb');

const session = new Session();
readline
    .createInterface({ input: process.stdin })
    .on('line', (line) => {
        let answer;
        try {
            answer = { result: session.query(JSON.parse(line).sql, 'TSV') };
        } catch (error) {
            answer = { error: String(error) };
        }
        process.stdout.write(JSON.stringify(answer) + '\n');
    })
    .on('close', () => session.cleanup());

// Checks request bodies against the protocol's own definition, as its makers compiled it:
//
//     node check.js <file with a body>...
//
// A body passes when the definition accepts it and when it is unchanged after a conversion to the binary form
// and back. A member that the definition does not know would be lost in that, and a value of a wrong type
// would change.
// Exit code 0: all pass.

'use strict';

const assert = require('assert');
const fs = require('fs');
const root = require('@opentelemetry/otlp-transformer/build/src/generated/root');

const collector = root.opentelemetry.proto.collector;

function check(body) {
  const Message = 'resourceMetrics' in body
    ? collector.metrics.v1.ExportMetricsServiceRequest
    : collector.logs.v1.ExportLogsServiceRequest;
  const message = Message.fromObject(body);
  const problem = Message.verify(message);
  if (problem) throw new Error(problem);
  const decoded = Message.decode(Message.encode(message).finish());
  assert.deepStrictEqual(plain(Message.toObject(decoded, { longs: String })), plain(body));
}

// Removes differences that do not matter: prototypes, the order of members, and empty lists, which the binary
// form leaves out.
function plain(value) {
  const isEmptyList = (member) => Array.isArray(member) && member.length === 0;
  return JSON.parse(JSON.stringify(value, (key, member) =>
    member && typeof member === 'object' && !Array.isArray(member)
      ? Object.fromEntries(Object.entries(member)
        .filter(([, inner]) => !isEmptyList(inner))
        .sort(([a], [b]) => (a < b ? -1 : 1)))
      : member));
}

let failed = process.argv.length < 3;
for (const file of process.argv.slice(2)) {
  try {
    check(JSON.parse(fs.readFileSync(file, 'utf8')));
  } catch (error) {
    failed = true;
    console.log(`${file}: ${error.message}`);
  }
}
process.exit(failed ? 1 : 0);

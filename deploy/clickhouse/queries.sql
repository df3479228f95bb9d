-- Five queries to begin with, of the last 30 days. They are the same for events.sql and events-old.sql. Days
-- are days in UTC. A user without an open id is "visitor", and is not counted as a user.

-- 1. How much is each module used, day by day, by how many users on how many installations?
SELECT
    day,
    module,
    uniqMerge(events) AS events,
    uniqMerge(users) AS users,
    uniqMerge(installations) AS installations
FROM hublink.events_per_day
WHERE day > today() - 30
GROUP BY day, module
ORDER BY day, module;

-- 2. Which events happen most, to how many users, and when last?
SELECT
    event,
    count() AS events,
    uniqIf(user, user NOT IN ('', 'visitor')) AS users,
    max(time) AS last
FROM hublink.events
WHERE time > now() - INTERVAL 30 DAY
GROUP BY event
ORDER BY events DESC, event
LIMIT 20;

-- 3. Which version of the suite does each installation use now?
SELECT
    version,
    count() AS installations,
    max(last) AS last_seen
FROM
(
    SELECT
        outbox,
        argMax(suite_version, time) AS version,
        max(time) AS last
    FROM hublink.events
    WHERE time > now() - INTERVAL 30 DAY
    GROUP BY outbox
)
GROUP BY version
ORDER BY installations DESC, version;

-- 4. How is a number distributed that an event carries? Here it is `clicks`; put another member in its two
-- places. In a current engine data['clicks'] is short for data.values[indexOf(data.keys, 'clicks')].
SELECT
    event,
    count() AS events,
    sum(number) AS total,
    quantileExact(0.5)(number) AS median,
    quantileExact(0.95)(number) AS most,
    max(number) AS highest
FROM
(
    SELECT
        event,
        toFloat64OrZero(data.values[indexOf(data.keys, 'clicks')]) AS number
    FROM hublink.events
    WHERE time > now() - INTERVAL 30 DAY AND has(data.keys, 'clicks')
)
GROUP BY event
ORDER BY event;

-- 5. Does everything arrive? The numbers of a module's events on an installation have no gap. A number that
-- is missing was refused, dropped, is a dead letter, or is still on its way. What was lost before the first
-- event of these 30 days, or after the last one, does not show. Rows of the local store have no number.
SELECT
    module,
    sum(expected) AS sent,
    sum(present) AS arrived,
    sent - arrived AS missing,
    countIf(expected > present) AS installations_with_gaps
FROM
(
    SELECT
        outbox,
        module,
        max(sequence) - min(sequence) + 1 AS expected,
        uniqExact(sequence) AS present
    FROM hublink.events
    WHERE time > now() - INTERVAL 30 DAY AND sequence > 0
    GROUP BY outbox, module
)
GROUP BY module
ORDER BY module;

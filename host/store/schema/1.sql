-- Version 1 of the schema of a store. Both engines execute this text; {id}, {bytes} and {clustered} stand for
-- words of the engine's own.
--
-- Times are microseconds since 1970-01-01 00:00 UTC. Texts are UTF-8. Where a text was not given it is empty.
-- A number that may not be absent is NULL when it is NaN; infinities are stored as they are.

CREATE TABLE stations (
    id {id},
    name TEXT NOT NULL UNIQUE
);

-- A unit is a serial number of a part.
CREATE TABLE units (
    id {id},
    serial TEXT NOT NULL,
    part TEXT NOT NULL,
    UNIQUE (serial, part)
);

-- What is measured, and what it is counted in.
CREATE TABLE quantities (
    id {id},
    name TEXT NOT NULL,
    unit TEXT NOT NULL,
    UNIQUE (name, unit)
);

-- A limit never changes: other bounds are another row. A bound that is not set has no value of _open.
CREATE TABLE limits (
    id {id},
    name TEXT NOT NULL,
    bounds TEXT NOT NULL,  -- as reports show them: '≥ 30 and < 60'
    lower DOUBLE PRECISION,
    lower_open SMALLINT,   -- 1 when the bound's own value is outside
    upper DOUBLE PRECISION,
    upper_open SMALLINT,
    UNIQUE (name, bounds)
);

-- One run of a diagnostic, or of an experiment on its own. Each repetition is a run.
CREATE TABLE runs (
    id {id},
    uuid TEXT NOT NULL UNIQUE,
    started BIGINT NOT NULL,
    day TEXT NOT NULL,  -- on which it started, in UTC: '2026-11-25'
    seconds DOUBLE PRECISION NOT NULL,
    diagnostic TEXT NOT NULL,
    summary TEXT NOT NULL,
    verdict TEXT NOT NULL CHECK (verdict IN ('pass', 'fail', 'error', 'interrupted')),
    repetition BIGINT NOT NULL,  -- from 1
    station_id BIGINT NOT NULL REFERENCES stations (id),
    unit_id BIGINT REFERENCES units (id),  -- NULL when no serial number was given
    part TEXT NOT NULL,
    lot TEXT NOT NULL,
    operator TEXT NOT NULL,  -- personal data
    metadata TEXT NOT NULL,  -- JSON: [["key", "value"], ...]
    version TEXT NOT NULL,   -- of the program
    command_line TEXT NOT NULL,
    session_started BIGINT NOT NULL,
    device TEXT NOT NULL,
    device_summary TEXT NOT NULL,
    device_facts TEXT NOT NULL,  -- JSON: [["name", "text"], ...]
    frames_delivered BIGINT NOT NULL,
    frames_lost BIGINT,          -- NULL when the frames had no numbers
    images_delivered BIGINT NOT NULL,
    auxiliary TEXT NOT NULL      -- JSON: what else the experiment returned
);
CREATE INDEX runs_started ON runs (started);
CREATE INDEX runs_diagnostic ON runs (diagnostic, started);
CREATE INDEX runs_station ON runs (station_id, started);
CREATE INDEX runs_unit ON runs (unit_id, diagnostic, started);

-- The experiment of a run, and the analysis of a diagnostic.
CREATE TABLE steps (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    part TEXT NOT NULL CHECK (part IN ('experiment', 'analysis')),
    name TEXT NOT NULL,
    summary TEXT NOT NULL,
    seconds DOUBLE PRECISION,  -- NULL when it was not reached
    parameters TEXT NOT NULL,  -- JSON: [{"name": "frameCount", "kind": "int32", "value": 90}, ...]
    PRIMARY KEY (run_id, part)
) {clustered};

-- Measurements of the experiment, results of the analysis, and what limits of the bench found: those of its
-- user, on what the module records and does not judge.
CREATE TABLE results (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    by_bench SMALLINT NOT NULL DEFAULT 0,  -- 1 when a limit of the bench judged, 0 when the module did
    of_analysis SMALLINT NOT NULL,  -- 1 for a result of the analysis, else 0
    place INTEGER NOT NULL,         -- from 0
    quantity_id BIGINT NOT NULL REFERENCES quantities (id),
    value DOUBLE PRECISION,
    limit_id BIGINT REFERENCES limits (id),
    judgement SMALLINT NOT NULL,    -- 0 not judged, 1 within its limit, 2 outside, 3 not measured
    decides SMALLINT NOT NULL DEFAULT 1,  -- 0 when the judgement is not part of the verdict
    note TEXT NOT NULL DEFAULT '',  -- why it was not measured
    PRIMARY KEY (run_id, by_bench, of_analysis, place)
) {clustered};
CREATE INDEX results_outside ON results (quantity_id, run_id) WHERE judgement = 2;

-- What failed (depth 0), and what caused it (depth 1, what caused that: depth 2, and so on).
CREATE TABLE failures (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    place INTEGER NOT NULL,  -- from 0
    depth INTEGER NOT NULL,
    part TEXT NOT NULL,
    step TEXT NOT NULL,
    domain TEXT,             -- these three: NULL when it failed without an error object
    code BIGINT,
    description TEXT,
    message TEXT NOT NULL,   -- what happened when there is no error object
    PRIMARY KEY (run_id, place, depth)
) {clustered};

CREATE TABLE logs (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    place INTEGER NOT NULL,  -- from 0
    time BIGINT NOT NULL,
    level TEXT NOT NULL,     -- 'debug', 'default', 'error'
    late SMALLINT NOT NULL,  -- 1 when the run had ended
    message TEXT NOT NULL,
    PRIMARY KEY (run_id, place)
) {clustered};

-- Kept on request: 'frames', 'images'.
CREATE TABLE attachments (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    name TEXT NOT NULL,
    type TEXT NOT NULL,  -- media type
    content {bytes} NOT NULL,
    PRIMARY KEY (run_id, name)
);

-- Judged runs of each unit and diagnostic, counted from 1 by time. A run that is delivered late is counted
-- where it belongs; one without a verdict about the unit is not an attempt.
CREATE VIEW attempts AS
SELECT id AS run_id, unit_id, diagnostic, started, verdict,
       row_number() OVER (PARTITION BY unit_id, diagnostic ORDER BY started, uuid) AS attempt,
       row_number() OVER (PARTITION BY unit_id, diagnostic ORDER BY started DESC, uuid DESC) AS attempt_from_last
FROM runs
WHERE unit_id IS NOT NULL AND verdict IN ('pass', 'fail');

-- Measurements and results with their names, for people who read the store.
CREATE VIEW named_results AS
SELECT runs.uuid, runs.started, runs.diagnostic, stations.name AS station, units.serial, units.part, runs.lot,
       quantities.name, results.value, quantities.unit, limits.name AS limit_name, limits.bounds,
       CASE results.judgement WHEN 1 THEN 'within' WHEN 2 THEN 'outside' WHEN 3 THEN 'not measured'
                              ELSE 'information' END AS judgement,
       CASE WHEN results.by_bench = 1 THEN 'bench' WHEN results.of_analysis = 1 THEN 'analysis'
            ELSE 'experiment' END AS source
FROM results
JOIN runs ON runs.id = results.run_id
JOIN quantities ON quantities.id = results.quantity_id
JOIN stations ON stations.id = runs.station_id
LEFT JOIN units ON units.id = runs.unit_id
LEFT JOIN limits ON limits.id = results.limit_id;

PRAGMA foreign_keys=OFF;
BEGIN TRANSACTION;
CREATE TABLE schema_version (version BIGINT NOT NULL);
INSERT INTO schema_version VALUES(1);
CREATE TABLE stations (
    id INTEGER PRIMARY KEY,
    name TEXT NOT NULL UNIQUE
);
INSERT INTO stations VALUES(1,'bench-3');
CREATE TABLE units (
    id INTEGER PRIMARY KEY,
    serial TEXT NOT NULL,
    part TEXT NOT NULL,
    UNIQUE (serial, part)
);
INSERT INTO units VALUES(1,'SN-7','');
CREATE TABLE quantities (
    id INTEGER PRIMARY KEY,
    name TEXT NOT NULL,
    unit TEXT NOT NULL,
    UNIQUE (name, unit)
);
INSERT INTO quantities VALUES(1,'Number Fesk NTC','events');
INSERT INTO quantities VALUES(2,'Number MB ARM_MB_NOREAD','events');
INSERT INTO quantities VALUES(3,'Number MB ARM_MB_STATE','events');
INSERT INTO quantities VALUES(4,'Number MB EN_FORCE_LOW','events');
INSERT INTO quantities VALUES(5,'Number MB EN_PIN_STATE','events');
INSERT INTO quantities VALUES(6,'Number MB MODID_ECC_ERR','events');
INSERT INTO quantities VALUES(7,'Number MB MRI_ECC_ERR','events');
INSERT INTO quantities VALUES(8,'Number MB MRI_ECC_ERR_FATAL','events');
INSERT INTO quantities VALUES(9,'Number MB NON_ZERO_PASS_KEY','events');
INSERT INTO quantities VALUES(10,'Number MB PASS_KEY_ECC_ERR','events');
INSERT INTO quantities VALUES(11,'Number MB PASS_KEY_ECC_ERR_FATAL','events');
INSERT INTO quantities VALUES(12,'Number Qorn NTC','events');
INSERT INTO quantities VALUES(13,'Number Xel INT_ADC_READY_LATCH','events');
INSERT INTO quantities VALUES(14,'Number Xel INT_BBSAT_LATCH','events');
INSERT INTO quantities VALUES(15,'Number Xel INT_FAULT_BBA_OVC_LATCH','events');
INSERT INTO quantities VALUES(16,'Number Xel INT_FAULT_BBA_OVP_LATCH','events');
INSERT INTO quantities VALUES(17,'Number Xel INT_FAULT_BBA_OVV_LATCH','events');
INSERT INTO quantities VALUES(18,'Number Xel INT_FAULT_BBA_UDC_LATCH','events');
INSERT INTO quantities VALUES(19,'Number Xel INT_FAULT_BBA_WDG_SFST_LATCH','events');
INSERT INTO quantities VALUES(20,'Number Xel INT_FAULT_BBB_OVC_LATCH','events');
INSERT INTO quantities VALUES(21,'Number Xel INT_FAULT_BBB_OVP_LATCH','events');
INSERT INTO quantities VALUES(22,'Number Xel INT_FAULT_BBB_OVV_LATCH','events');
INSERT INTO quantities VALUES(23,'Number Xel INT_FAULT_BBB_UDC_LATCH','events');
INSERT INTO quantities VALUES(24,'Number Xel INT_FAULT_BBB_WDG_SFST_LATCH','events');
INSERT INTO quantities VALUES(25,'Number Xel INT_FAULT_CC','events');
INSERT INTO quantities VALUES(26,'Number Xel INT_FAULT_LS_OVC_LATCH','events');
INSERT INTO quantities VALUES(27,'Number Xel INT_FAULT_LVT_LATCH','events');
INSERT INTO quantities VALUES(28,'Number Xel INT_FAULT_MAXDC_CLKLP_BBA_LATCH','events');
INSERT INTO quantities VALUES(29,'Number Xel INT_FAULT_MAXDC_CLKLP_BBB_LATCH','events');
INSERT INTO quantities VALUES(30,'Number Xel INT_FAULT_MAXDC_CLKSAF_BBA_LATCH','events');
INSERT INTO quantities VALUES(31,'Number Xel INT_FAULT_MAXDC_CLKSAF_BBB_LATCH','events');
INSERT INTO quantities VALUES(32,'Number Xel INT_FAULT_MAXPC_LATCH','events');
INSERT INTO quantities VALUES(33,'Number Xel INT_FAULT_MAXPW_CLKLP_BBA_LATCH','events');
INSERT INTO quantities VALUES(34,'Number Xel INT_FAULT_MAXPW_CLKLP_BBB_LATCH','events');
INSERT INTO quantities VALUES(35,'Number Xel INT_FAULT_MAXPW_CLKSAF_BBA_LATCH','events');
INSERT INTO quantities VALUES(36,'Number Xel INT_FAULT_MAXPW_CLKSAF_BBB_LATCH','events');
INSERT INTO quantities VALUES(37,'Number Xel INT_FAULT_OTP_LATCH','events');
INSERT INTO quantities VALUES(38,'Number Xel INT_FAULT_SHORTANODE_ACT_LATCH','events');
INSERT INTO quantities VALUES(39,'Number Xel INT_FAULT_SHORTANODE_LATCH','events');
INSERT INTO quantities VALUES(40,'Number Xel INT_FAULT_STBYDLY_LATCH','events');
INSERT INTO quantities VALUES(41,'Number Xel INT_FAULT_STROBE_SHORT_LATCH','events');
INSERT INTO quantities VALUES(42,'Number Xel INT_FAULT_TAMP_LATCH','events');
INSERT INTO quantities VALUES(43,'Number Xel INT_FAULT_THROT_LATCH','events');
INSERT INTO quantities VALUES(44,'Number Xel INT_FAULT_THSD_LATCH','events');
INSERT INTO quantities VALUES(45,'Number Xel INT_FAULT_TSD_WARN_LATCH','events');
INSERT INTO quantities VALUES(46,'Number Xel INT_FAULT_VINUVLO_LATCH','events');
INSERT INTO quantities VALUES(47,'Number Xel INT_FAULT_VIN_OVV_LATCH','events');
INSERT INTO quantities VALUES(48,'Number Xel INT_FAULT_XEF0','events');
INSERT INTO quantities VALUES(49,'Number Xel INT_FAULT_XEF1','events');
INSERT INTO quantities VALUES(50,'Number Xel INT_I2CWDG_LATCH','events');
INSERT INTO quantities VALUES(51,'Number Xel INT_MODE1_LATCH','events');
INSERT INTO quantities VALUES(52,'Number Xel INT_SUPPLY_LATCH','events');
INSERT INTO quantities VALUES(53,'Number YB FAULT_A','events');
INSERT INTO quantities VALUES(54,'Number YB FAULT_B','events');
INSERT INTO quantities VALUES(55,'Number YB FAULT_C','events');
INSERT INTO quantities VALUES(56,'Number YB FAULT_D','events');
INSERT INTO quantities VALUES(57,'Number YB FAULT_E','events');
INSERT INTO quantities VALUES(58,'Number YB FAULT_NVM','events');
INSERT INTO quantities VALUES(59,'Number YB FAULT_OV','events');
INSERT INTO quantities VALUES(60,'Number YB FAULT_UV','events');
CREATE TABLE limits (
    id INTEGER PRIMARY KEY,
    name TEXT NOT NULL,
    bounds TEXT NOT NULL,  -- as reports show them: '≥ 30 and < 60'
    lower DOUBLE PRECISION,
    lower_open SMALLINT,   -- 1 when the bound's own value is outside
    upper DOUBLE PRECISION,
    upper_open SMALLINT,
    UNIQUE (name, bounds)
);
INSERT INTO limits VALUES(1,'Max Reports','0 … 0',0.0,0,0.0,0);
CREATE TABLE runs (
    id INTEGER PRIMARY KEY,
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
INSERT INTO runs VALUES(1,'01a212c2-2bcb-7fe2-abd2-8b620a491672',1795611044811654,'2026-11-25',0.00016445599999999999888,'VantorMeterixDiagnostic','Measure the important Vantor Meterixs and ensure they are all present.','pass',1,1,1,'','','Joe','[["fixture","7"]]','1.0.0','zrlab run VantorMeterixDiagnostic --store v1.db --unit SN-7 --station bench-3 --operator Joe --meta fixture=7',1795611044810585,'healthy','A device without faults: every run passes.','[["platform","simulated device"]]',0,NULL,0,'{}');
CREATE TABLE steps (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    part TEXT NOT NULL CHECK (part IN ('experiment', 'analysis')),
    name TEXT NOT NULL,
    summary TEXT NOT NULL,
    seconds DOUBLE PRECISION,  -- NULL when it was not reached
    parameters TEXT NOT NULL,  -- JSON: [{"name": "frameCount", "kind": "int32", "value": 90}, ...]
    PRIMARY KEY (run_id, part)
) WITHOUT ROWID;
INSERT INTO steps VALUES(1,'analysis','VantorMeterixAnalysis','Make sure all the Vantor Meterixs were measured.',3.0706000000000000437e-05,'[]');
INSERT INTO steps VALUES(1,'experiment','VantorMeterixExperiment','Check for any Vantor IO  Reports.',3.3219000000000001619e-05,'[]');
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
) WITHOUT ROWID;
INSERT INTO results VALUES(1,0,0,0,1,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,1,2,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,2,3,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,3,4,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,4,5,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,5,6,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,6,7,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,7,8,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,8,9,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,9,10,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,10,11,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,11,12,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,12,13,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,13,14,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,14,15,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,15,16,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,16,17,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,17,18,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,18,19,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,19,20,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,20,21,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,21,22,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,22,23,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,23,24,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,24,25,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,25,26,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,26,27,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,27,28,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,28,29,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,29,30,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,30,31,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,31,32,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,32,33,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,33,34,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,34,35,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,35,36,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,36,37,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,37,38,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,38,39,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,39,40,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,40,41,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,41,42,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,42,43,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,43,44,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,44,45,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,45,46,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,46,47,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,47,48,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,48,49,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,49,50,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,50,51,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,51,52,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,52,53,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,53,54,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,54,55,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,55,56,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,56,57,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,57,58,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,58,59,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,0,59,60,0.0,NULL,0,1,'');
INSERT INTO results VALUES(1,0,1,0,13,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,1,14,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,2,15,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,3,16,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,4,17,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,5,18,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,6,19,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,7,20,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,8,21,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,9,22,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,10,23,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,11,24,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,12,25,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,13,26,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,14,27,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,15,28,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,16,29,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,17,30,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,18,31,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,19,32,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,20,33,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,21,34,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,22,35,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,23,36,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,24,37,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,25,38,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,26,39,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,27,40,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,28,41,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,29,42,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,30,43,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,31,44,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,32,45,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,33,46,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,34,47,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,35,48,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,36,49,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,37,50,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,38,51,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,39,52,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,40,2,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,41,3,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,42,4,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,43,5,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,44,6,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,45,7,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,46,8,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,47,9,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,48,10,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,49,11,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,50,53,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,51,54,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,52,55,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,53,56,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,54,57,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,55,58,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,56,60,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,57,59,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,58,12,0.0,1,1,1,'');
INSERT INTO results VALUES(1,0,1,59,1,0.0,1,1,1,'');
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
) WITHOUT ROWID;
CREATE TABLE logs (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    place INTEGER NOT NULL,  -- from 0
    time BIGINT NOT NULL,
    level TEXT NOT NULL,     -- 'debug', 'default', 'error'
    late SMALLINT NOT NULL,  -- 1 when the run had ended
    message TEXT NOT NULL,
    PRIMARY KEY (run_id, place)
) WITHOUT ROWID;
CREATE TABLE attachments (
    run_id BIGINT NOT NULL REFERENCES runs (id),
    name TEXT NOT NULL,
    type TEXT NOT NULL,  -- media type
    content BLOB NOT NULL,
    PRIMARY KEY (run_id, name)
);
CREATE INDEX runs_started ON runs (started);
CREATE INDEX runs_diagnostic ON runs (diagnostic, started);
CREATE INDEX runs_station ON runs (station_id, started);
CREATE INDEX runs_unit ON runs (unit_id, diagnostic, started);
CREATE INDEX results_outside ON results (quantity_id, run_id) WHERE judgement = 2;
CREATE VIEW attempts AS
SELECT id AS run_id, unit_id, diagnostic, started, verdict,
       row_number() OVER (PARTITION BY unit_id, diagnostic ORDER BY started, uuid) AS attempt,
       row_number() OVER (PARTITION BY unit_id, diagnostic ORDER BY started DESC, uuid DESC) AS attempt_from_last
FROM runs
WHERE unit_id IS NOT NULL AND verdict IN ('pass', 'fail');
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
COMMIT;

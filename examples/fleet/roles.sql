-- Who may do what in a store in PostgreSQL. Whoever owns the database runs it, once the tables are
-- there, and again after a newer ipmisel has changed them:
--
--   createdb ipmisel
--   ipmisel check --store postgresql:///ipmisel      # makes the tables
--   psql -d ipmisel -f roles.sql
--   psql -d ipmisel -c 'CREATE ROLE node17 LOGIN IN ROLE ipmisel_collector'
--
-- What is kept of an event for ever (its key, its bytes, when it was first seen) nobody but the
-- owner can change, and nobody but the owner can delete anything.
DO $$
DECLARE
    name TEXT;
BEGIN
    FOREACH name IN ARRAY ARRAY['ipmisel_reader', 'ipmisel_operator', 'ipmisel_collector'] LOOP
        IF NOT EXISTS (SELECT 1 FROM pg_catalog.pg_roles WHERE rolname = name) THEN
            EXECUTE format('CREATE ROLE %I NOLOGIN', name);
        END IF;
    END LOOP;
END
$$;

-- ipmisel check, diff and report; the questions of docs/store.md.
GRANT SELECT ON schema_versions, systems, visits, events, seen_events, parts, findings,
    acknowledgements, log_states TO ipmisel_reader;

-- ipmisel ack.
GRANT ipmisel_reader TO ipmisel_operator;
GRANT UPDATE (acknowledged) ON findings TO ipmisel_operator;
GRANT INSERT, UPDATE (ended) ON acknowledgements TO ipmisel_operator;

-- ipmisel collect and watch.
GRANT ipmisel_reader TO ipmisel_collector;
GRANT INSERT ON systems, visits, events, parts, findings, log_states TO ipmisel_collector;
GRANT UPDATE ON systems, visits, findings, log_states TO ipmisel_collector;
GRANT UPDATE (time, severity, state, sensor, part, sentence, properties, digest, position,
    left_after, gone, gone_visit) ON events TO ipmisel_collector;
GRANT UPDATE (gone, gone_visit) ON parts TO ipmisel_collector;
GRANT UPDATE (ended) ON acknowledgements TO ipmisel_collector;

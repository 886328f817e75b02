# The CTest fixtures of the ODBC suites (included by each of them, defined once):
# - odbc_config: a private unixODBC configuration (drivers and DSNs, no server);
# - odbc_postgres: a private PostgreSQL server on loopback with its own configuration,
#   started before the first test that needs it and stopped after the last.
# Tests find what a fixture made through the file named by OXQEL_ODBC_ENV.
include_guard(GLOBAL)

set(state ${PROJECT_BINARY_DIR}/odbc-test)
set(scripts ${PROJECT_SOURCE_DIR}/scripts/testservers)

add_test(NAME odbc_config_setup COMMAND ${scripts}/odbc-config ${state}/config)
set_tests_properties(odbc_config_setup PROPERTIES FIXTURES_SETUP odbc_config LABELS unit TIMEOUT 60)

add_test(NAME odbc_postgres_start COMMAND ${scripts}/start ${state}/server)
set_tests_properties(odbc_postgres_start PROPERTIES FIXTURES_SETUP odbc_postgres LABELS server
  TIMEOUT 180)
add_test(NAME odbc_postgres_stop COMMAND ${scripts}/stop ${state}/server)
set_tests_properties(odbc_postgres_stop PROPERTIES FIXTURES_CLEANUP odbc_postgres LABELS server
  TIMEOUT 120)

set(OXQEL_ODBC_UNIT_PROPERTIES
  FIXTURES_REQUIRED odbc_config ENVIRONMENT OXQEL_ODBC_ENV=${state}/config/odbc.env
  CACHE INTERNAL "test properties of ODBC suites without a server")
set(OXQEL_ODBC_SERVER_PROPERTIES
  FIXTURES_REQUIRED odbc_postgres ENVIRONMENT OXQEL_ODBC_ENV=${state}/server/env
  CACHE INTERNAL "test properties of ODBC suites that need the PostgreSQL server")

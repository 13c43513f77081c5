// Its headers are compiled once, for all tests of units.

-- The rows of one table as a Parquet file, compressed.
COPY (FROM "{{table}}") TO {{file}} (FORMAT parquet, COMPRESSION zstd)

SELECT name, min(value), max(value), avg(value), count(*) FROM distribution_values JOIN keys ON id = key_id
  WHERE day BETWEEN 20779 AND 20780 GROUP BY key_id;
SELECT name, value FROM keys JOIN scalars ON key_id = id WHERE day BETWEEN 20779 AND 20780 ORDER BY name, day;

-- wrk script of bench/run: sends the device's access token and prints one
-- line to parse.
--
--   ORVA_BENCH_TOKEN      the token sent as "Authorization: Bearer TOKEN"

local token = os.getenv("ORVA_BENCH_TOKEN")
if token then
   wrk.headers["Authorization"] = "Bearer " .. token
end

function done(summary, latency, requests)
   local e = summary.errors
   io.write(string.format(
      "ORVA_BENCH requests=%d duration_us=%d p50_us=%d p99_us=%d " ..
      "status_errors=%d socket_errors=%d\n",
      summary.requests, summary.duration, latency:percentile(50),
      latency:percentile(99), e.status, e.connect + e.read + e.write + e.timeout))
end

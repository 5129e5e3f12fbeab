-- wrk script of bench/run: sends the device's access token, optionally stops
-- each thread after a number of answers, and prints one line to parse.
--
--   ORVA_BENCH_TOKEN      the token sent as "Authorization: Bearer TOKEN"
--   ORVA_BENCH_REQUESTS   answers per thread after which the thread stops
--                         (unset: run for wrk's duration)

local token = os.getenv("ORVA_BENCH_TOKEN")
if token then
   wrk.headers["Authorization"] = "Bearer " .. token
end

local limit = tonumber(os.getenv("ORVA_BENCH_REQUESTS") or "")
if limit then
   local answers = 0
   -- Defined only with a limit: a response() hook makes wrk hand every
   -- answer to Lua, which slows the client down.
   function response()
      answers = answers + 1
      if answers >= limit then
         wrk.thread:stop()
      end
   end
end

function done(summary, latency, requests)
   local e = summary.errors
   io.write(string.format(
      "ORVA_BENCH requests=%d duration_us=%d p50_us=%d p99_us=%d " ..
      "status_errors=%d socket_errors=%d\n",
      summary.requests, summary.duration, latency:percentile(50),
      latency:percentile(99), e.status, e.connect + e.read + e.write + e.timeout))
end

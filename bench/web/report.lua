-- What wrk has measured, as a line of JSON.
done = function(summary, latency, requests)
  local errors = summary.errors
  io.write(string.format(
    '{"requests": %d, "seconds": %.6f, "p99_ms": %.3f, "failures": %d}\n',
    summary.requests, summary.duration / 1e6, latency:percentile(99.0) / 1e3,
    errors.connect + errors.read + errors.write + errors.status + errors.timeout))
end

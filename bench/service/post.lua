-- For wrk: posts one file after another as a trail, and prints what came of it as a line of JSON.
--
--   wrk ... -s post.lua URL -- PATH FILE...     PATH as in /v1/match?speeds=0

local threads = {}
local number = 0

function setup(thread)
    number = number + 1
    thread:set("number", number)
    table.insert(threads, thread)
end

function init(args)
    bodies = {}
    path = args[1]
    for i = 2, #args do
        local file = assert(io.open(args[i], "rb"))
        table.insert(bodies, file:read("*a"))
        file:close()
    end
    at = number * 7
    others = 0
    busy = 0
end

function request()
    at = at + 1
    local headers = {["Content-Type"] = "application/x-kzt"}
    return wrk.format("POST", path, headers, bodies[at % #bodies + 1])
end

function response(status)
    if status == 503 then
        busy = busy + 1
    elseif status ~= 200 then
        others = others + 1
    end
end

function done(summary, latency)
    local busy, others = 0, 0
    for _, thread in ipairs(threads) do
        busy = busy + thread:get("busy")
        others = others + thread:get("others")
    end
    local errors = summary.errors
    io.write(string.format(
        '\n{"requests":%d,"seconds":%.6f,"median":%.6f,"p99":%.6f,"most":%.6f,"busy":%d,' ..
        '"others":%d,"connect":%d,"read":%d,"write":%d,"timeout":%d}\n',
        summary.requests, summary.duration / 1e6, latency:percentile(50) / 1e6,
        latency:percentile(99) / 1e6, latency.max / 1e6, busy, others,
        errors.connect, errors.read, errors.write, errors.timeout))
end

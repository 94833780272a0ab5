-- wrk script: counts the answers of the web host by the code before the TAB of their body
-- (and by HTTP status), and prints one line per code when the run ends:
--   answer code <code> <count>
--   answer http <status> <count>
local threads = {}

function setup(thread)
  table.insert(threads, thread)
end

function init(args)
  codes = {}
  statuses = {}
end

function response(status, headers, body)
  local code = string.match(body, "^(-?%d+)\t") or "none"
  codes[code] = (codes[code] or 0) + 1
  local key = tostring(status)
  statuses[key] = (statuses[key] or 0) + 1
end

local function merge(total, part)
  for key, count in pairs(part) do
    total[key] = (total[key] or 0) + count
  end
end

function done(summary, latency, requests)
  local allCodes, allStatuses = {}, {}
  for _, thread in ipairs(threads) do
    merge(allCodes, thread:get("codes"))
    merge(allStatuses, thread:get("statuses"))
  end
  for code, count in pairs(allCodes) do
    io.write(string.format("answer code %s %d\n", code, count))
  end
  for status, count in pairs(allStatuses) do
    io.write(string.format("answer http %s %d\n", status, count))
  end
end

-- A LÖVE game whose worker thread records 500 events while this main state has a handler. Its calls and
-- the handler stay in this state; the log is read back with orvane-logcat (ORVANE_LOGCAT). Exit status 0
-- when every message and record is there.
local orvane = require("orvane")
local heard, worker, problems = {}, nil, {}
local function check(ok, what) if not ok then problems[#problems + 1] = what end end

function love.load()
  orvane.register_for_logs(function(level, message) heard[#heard + 1] = { level, message } end)
  local user, game = orvane.get_user_uuid(), orvane.get_game_id()
  check(user == "3f6c-ünï" and game == "space-race", "identity " .. user .. " " .. game)
  check(heard[1][2] == "[OrvaneSDK] Logging initiated.", "first message " .. tostring(heard[1][2]))
  check(orvane.analytics_init(game, user) == 0, "INIT")
  check(orvane.analytics_special(game, user, "a\0b") == -1, "a NUL refused")
  worker = love.thread.newThread("worker.lua")
  worker:start(game, user)
end

local function count(list, level, message)
  local n = 0
  for _, m in ipairs(list) do if m[1] == level and m[2] == message then n = n + 1 end end
  return n
end

function love.update()
  check(not worker:getError(), "worker: " .. tostring(worker:getError()))
  if worker:isRunning() or count(heard, 0, "[OrvaneSDK] Analytics SPECIAL - OK") < 500 and #problems == 0 then
    return
  end
  local refused = "[OrvaneSDK] Analytics SPECIAL - failed. Text holds a NUL character."
  check(count(heard, 2, refused) == 2, "the main state's and the worker's NUL refusals")
  check(love.thread.getChannel("worker identity"):pop() == "3f6c-ünï space-race", "the worker's identity")
  local log = os.getenv("XDG_DATA_HOME") .. "/Orvane/Logs/space-race.log"
  local reader = io.popen(os.getenv("ORVANE_LOGCAT") .. " " .. log)
  local extras = {}
  for line in reader:lines() do extras[#extras + 1] = line:match('"type":"(%u+)"') .. " " .. line:match('"extra":"(.-)"}') end
  reader:close()
  check(#extras == 501 and extras[1] == "INIT ", "records: " .. #extras)
  for n = 1, 500 do check(extras[n + 1] == "SPECIAL n=" .. n .. ";é", "record " .. n) end
  for _, problem in ipairs(problems) do print("FAILED: " .. problem) end
  love.event.quit(#problems == 0 and 0 or 1)
end

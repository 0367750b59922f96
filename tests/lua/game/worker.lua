-- The worker: 500 events through the module, which queues them for the main state.
local game, user = ...
local orvane = require("orvane")
for n = 1, 500 do assert(orvane.analytics_special(game, user, "n=" .. n .. ";é") == 0) end
assert(orvane.analytics_special(game, user, "a\0b") == -1)
assert(orvane.get_version() == "1.0.0")
love.thread.getChannel("worker identity"):push(orvane.get_user_uuid() .. " " .. orvane.get_game_id())

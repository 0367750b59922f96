-- OrvaneSDK for LuaJIT (FFI): the library's exports for LÖVE 11 games and other LuaJIT hosts.
--
--   local orvane = require("orvane")
--   orvane.register_for_logs(function(level, message) print(level, message) end)
--   local user, game = orvane.get_user_uuid(), orvane.get_game_id()
--   if user ~= "" and game ~= "" then orvane.analytics_game_enter(game, user) end
--
-- Threads. A LuaJIT callback belongs to one Lua state and must never be entered from another OS thread,
-- while the library calls its callback on whichever thread records. So only the main state calls the
-- library; a love.thread worker that requires this module gets the same functions, which queue its calls
-- on a love.thread channel and wake the main state with a love.event ("orvane"). The main state runs them
-- from love.run's event loop, or when it next calls the module (orvane.update() also does, for a host with
-- a loop of its own), so the handler only ever runs in the main state, on its thread, with every message
-- of every state. In a worker:
--   analytics_* return 0 once queued (the library's own result and messages go to the main state's
--     handler when it runs the call); a text holding NUL is refused there and then (-1);
--   get_user_uuid and get_game_id return what the main state read when it first used the library;
--   register_for_logs raises an error: the handler is the main state's.
-- A host that is not LÖVE and runs LuaJIT states on several threads calls the library from one state only.
--
-- Texts are Lua strings, passed as their bytes (UTF-8 for UTF-8 text), nil counting as empty. A text
-- holding a NUL byte would end there for the library, which would store it cut: an analytics call refuses
-- it whole instead, returns -1 and the handler hears
-- (2, "[OrvaneSDK] Analytics <TYPE> - failed. Text holds a NUL character.").
-- Levels: orvane.INFO 0, orvane.WARNING 1, orvane.ERROR 2.
--
-- The library is loaded at the first call, from the path given to orvane.load(path), else beside the game
-- (a fused game's executable, the game's folder or the .love file's folder; elsewhere the folder of
-- arg[0]), else by the system loader's search (ffi.load("OrvaneSDK")).
local ffi = require("ffi")

ffi.cdef [[
typedef void (*OrvaneLogCallback)(int32_t level, const char *message);
void oRegisterForLogs(OrvaneLogCallback callback);
void oInitialize(void);
int32_t oAnalyticsInit(const char *gameId, const char *userId);
int32_t oAnalyticsGameEnter(const char *gameId, const char *userId);
int32_t oAnalyticsGameExit(const char *gameId, const char *userId);
int32_t oAnalyticsSpecial(const char *gameId, const char *userId, const char *extra);
char *oAuthGetUserUuid(void);
char *oAuthGetGameId(void);
void oFreeText(char *text);
const char *oGetVersion(void);
]]

local orvane = { INFO = 0, WARNING = 1, ERROR = 2 }
local lthread = love and love.thread
local is_main = not lthread or type(love.run) == "function" -- love.run exists in the main state only
local queue = lthread and lthread.getChannel("orvane.calls")
local identity = lthread and lthread.getChannel("orvane.identity")
local library, handler

local function beside_the_game()
  local folder
  if love and love.filesystem then
    local fs = love.filesystem
    local source = fs.getSource()
    folder = (fs.isFused() or source:match("%.love$")) and fs.getSourceBaseDirectory() or source
  elseif arg and arg[0] then
    folder = arg[0]:match("^(.*)[/\\]") or "."
  end
  for _, name in ipairs(ffi.os == "Windows" and { "OrvaneSDK.dll" } or { "libOrvaneSDK.so.1", "libOrvaneSDK.so" }) do
    local file = folder and io.open(folder .. "/" .. name, "rb")
    if file then file:close() return folder .. "/" .. name end
  end
end

local publish_identity

--- Loads the library once per state and returns its FFI namespace; path names the file.
function orvane.load(path)
  if not library then
    library = ffi.load(path or beside_the_game() or "OrvaneSDK")
    if is_main and identity then publish_identity() end
  end
  return library
end

local function lib() return library or orvane.load() end

local function deliver(level, message)
  local current = handler
  if not current then return end
  local ok, failure = pcall(current, level, message)
  -- What the handler raises must not unwind through the library's frames.
  if not ok then io.stderr:write("orvane: the log handler failed: ", tostring(failure), "\n") end
end

-- The one native callback of the main state, kept for the state's life: replacing the handler is an
-- assignment, and the library never calls a freed callback.
local native_callback = is_main and ffi.cast("OrvaneLogCallback", function(level, message)
  deliver(level, ffi.string(message))
end)

local function take_text(result)
  local text = ffi.string(result)
  lib().oFreeText(result)
  return text
end

local exports = {
  oInitialize = function() lib().oInitialize() end,
  oAnalyticsInit = function(g, u) return lib().oAnalyticsInit(g, u) end,
  oAnalyticsGameEnter = function(g, u) return lib().oAnalyticsGameEnter(g, u) end,
  oAnalyticsGameExit = function(g, u) return lib().oAnalyticsGameExit(g, u) end,
  oAnalyticsSpecial = function(g, u, e) return lib().oAnalyticsSpecial(g, u, e) end,
  message = deliver,
}

-- Runs the calls the workers queued, in their order (nil travels as false).
local function run_queued()
  if not queue then return end
  local call = queue:pop()
  while call do
    local a, b, c = call[2], call[3], call[4]
    exports[call[1]](a or nil, b or nil, c or nil)
    call = queue:pop()
  end
end

local function forward(name, a, b, c)
  queue:push({ name, a == nil and false or a, b == nil and false or b, c == nil and false or c })
  if love.event then love.event.push("orvane") end
end

local function holds_nul(type_name, ...)
  for i = 1, select("#", ...) do
    local text = select(i, ...)
    if type(text) == "string" and text:find("\0", 1, true) then
      local message = "[OrvaneSDK] Analytics " .. type_name .. " - failed. Text holds a NUL character."
      if is_main then deliver(orvane.ERROR, message) else forward("message", orvane.ERROR, message) end
      return true
    end
  end
  return false
end

local function call(name, ...)
  if not is_main then forward(name, ...) return 0 end
  run_queued()
  return exports[name](...)
end

--- Runs what worker states queued; love.run's event loop does it by itself.
function orvane.update()
  if is_main then run_queued() end
end

--- Makes handler(level, message) the one handler (main state only); nil unregisters. It at once hears
--- (0, "[OrvaneSDK] Logging initiated.").
function orvane.register_for_logs(new_handler)
  assert(is_main, "orvane: register the log handler in the main state; workers' messages reach it there")
  run_queued()
  if new_handler == nil then
    lib().oRegisterForLogs(nil)
    handler = nil
  else
    handler = new_handler
    lib().oRegisterForLogs(native_callback)
  end
end

function orvane.initialize() call("oInitialize") end

--- Analytics events: 0 when written (in a worker: queued), -1 when refused or not written.
function orvane.analytics_init(game_id, user_id)
  if holds_nul("INIT", game_id, user_id) then return -1 end
  return call("oAnalyticsInit", game_id, user_id)
end

function orvane.analytics_game_enter(game_id, user_id)
  if holds_nul("ENTER", game_id, user_id) then return -1 end
  return call("oAnalyticsGameEnter", game_id, user_id)
end

function orvane.analytics_game_exit(game_id, user_id)
  if holds_nul("EXIT", game_id, user_id) then return -1 end
  return call("oAnalyticsGameExit", game_id, user_id)
end

function orvane.analytics_special(game_id, user_id, extra)
  if holds_nul("SPECIAL", game_id, user_id, extra) then return -1 end
  return call("oAnalyticsSpecial", game_id, user_id, extra)
end

--- The launch identity ("" when absent), released with oFreeText inside.
function orvane.get_user_uuid()
  if not is_main then return (identity:peek() or {})[1] or "" end
  run_queued()
  return take_text(lib().oAuthGetUserUuid())
end

function orvane.get_game_id()
  if not is_main then return (identity:peek() or {})[2] or "" end
  run_queued()
  return take_text(lib().oAuthGetGameId())
end

--- The loaded library's version, "MAJOR.MINOR.PATCH" (sends no message: any state).
function orvane.get_version() return ffi.string(lib().oGetVersion()) end

-- A callback must not be entered from a call of JIT-compiled code, so nothing that can reach the
-- library is compiled.
for _, f in pairs(exports) do jit.off(f) end
for _, f in pairs(orvane) do if type(f) == "function" then jit.off(f) end end
jit.off(run_queued)
jit.off(call)

-- What the workers get as identity: the main state's, read when it first uses the library (the command
-- line does not change).
function publish_identity()
  local user, game = orvane.get_user_uuid(), orvane.get_game_id()
  identity:performAtomic(function(channel) channel:clear() channel:push({ user, game }) end)
end

if is_main and love and love.handlers then love.handlers.orvane = run_queued end
if not is_main then pcall(require, "love.event") end

return orvane

-- Shows the chat protocol's messages in Wireshark and tshark; docs/wireshark.md says how.
--
-- On a TCP connection each message travels in a frame: 1 byte with the length of its name, the
-- name, 4 bytes with its own length, most significant first, and the message. Frames are found here.
-- Wireshark's own dissector of Protocol Buffers shows the fields, as the schema has them.

local NAME_LIMIT, MESSAGE_LIMIT = 63, 1024 * 1024 -- in bytes, as in examples/framing.h

local qel = Proto("qel", "Chat message")
local fields = {
  name = ProtoField.string("qel.name", "Name"),
  size = ProtoField.uint32("qel.size", "Length"),
  direction = ProtoField.string("qel.direction", "Direction"),
}
qel.fields = fields
qel.prefs.port = Pref.uint("TCP port of the service", 0, "Not needed if frames begin packets")

-- Gives fields names for filters and columns, such as pbf.ChatReply.requestId. What the user's
-- preferences say comes later and is stronger.
set_preference("protobuf.pbf_as_hf", true)
set_preference("protobuf.preload_protos", true)

local protobuf = Dissector.get("protobuf")
local tcp_ports = DissectorTable.get("tcp.port")
local port = 0 -- as the preference was last
local services = {} -- the ends of connections where plug-ins signed in

function qel.init() services = {} end

-- The message's name and size, if a frame can begin at the offset. The name alone may be cut, and
-- comes without a size, if the rest of the frame's head is not there.
local function read_head(tvb, offset)
  local head = tvb:raw(offset, math.min(1 + NAME_LIMIT + 4, tvb:len() - offset))
  local length = head:byte()
  local name = head:sub(2, 1 + length)
  if length == 0 or length > NAME_LIMIT or name:find("[^A-Za-z0-9]") then return end
  if #head < 5 + length then return name end
  local size = tvb(offset + 1 + length, 4):uint()
  if size <= MESSAGE_LIMIT then return name, size end
end

-- Nothing in a frame tells which end is the service, but a plug-in signs in first.
local function direction(name, pinfo)
  local from = ("%s %d"):format(pinfo.src, pinfo.src_port)
  local to = ("%s %d"):format(pinfo.dst, pinfo.dst_port)
  if name == "ChannelAuthRequest" then services[to] = true end
  if services[to] or pinfo.dst_port == port then return "plug-in -> service" end
  if services[from] or pinfo.src_port == port then return "service -> plug-in" end
  return "unknown"
end

local function show(frame, name, size, pinfo, tree)
  local way = direction(name, pinfo)
  local item = tree:add(qel, frame, ("Chat message: %s, %d bytes, %s"):format(name, size, way))
  item:add(fields.name, frame(1, #name))
  item:add(fields.size, frame(1 + #name, 4))
  item:add(fields.direction, way):set_generated()
  pinfo.cols.info:clear()
  pinfo.cols.info:append(name .. " ")
  pinfo.cols.info:fence() -- keeps the names of all messages of a packet
  if frame:len() > 5 + #name then
    pinfo.private["pb_msg_type"] = "message," .. name
    -- A broken message is marked in the tree, and is an error here that must not hide the next one.
    pcall(protobuf.call, protobuf, frame(5 + #name):tvb(), pinfo, tree)
  end
  pinfo.cols.info:clear()
  pinfo.cols.protocol = "qel"
end

local function dissect(tvb, pinfo, tree)
  local offset = 0
  while offset < tvb:len() do
    local left = tvb:len() - offset
    local name, size = read_head(tvb, offset)
    local whole = size and 5 + #name + size
    if name and (not whole or whole > left) and pinfo.can_desegment > 0 then
      pinfo.desegment_offset = offset
      pinfo.desegment_len = whole and whole - left or DESEGMENT_ONE_MORE_SEGMENT
      return tvb:len()
    end
    if not whole then
      if offset > 0 then tree:add(qel, tvb(offset), "Chat message: none begins here") end
      return offset
    end
    show(tvb(offset, math.min(whole, left)), name, size, pinfo, tree)
    offset = offset + whole
  end
  return tvb:len()
end
qel.dissector = dissect

tcp_ports:add_for_decode_as(qel)
function qel.prefs_changed()
  tcp_ports:remove(port, qel)
  port = qel.prefs.port
  tcp_ports:add(port, qel)
end

-- On other ports a whole head has to come first, which hardly anything else looks like.
qel:register_heuristic("tcp", function(tvb, pinfo, tree)
  local _, size = read_head(tvb, 0)
  if not size then return false end
  pinfo.conversation = qel
  return dissect(tvb, pinfo, tree) > 0
end)

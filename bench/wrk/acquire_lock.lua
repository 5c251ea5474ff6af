-- wrk posts one DebugAcquireLock call per request to the worked example's server
-- (tarn-example serve): two object references, mode "x", no hold, one iteration.
-- The bearer token comes from TARN_EXAMPLE_TOKEN. Any answer other than 200 is
-- counted and reported at the end, so a refused run cannot pass for a fast one.
wrk.method = "POST"
wrk.path = "/orbit"
wrk.headers["Content-Type"] = "text/xml; charset=utf-8"
wrk.headers["SOAPAction"] = '"urn:tarnd3/4.0"'
wrk.headers["Authorization"] = "Bearer " .. (os.getenv("TARN_EXAMPLE_TOKEN") or "")
wrk.body = [[<e:Envelope xmlns:e="http://schemas.xmlsoap.org/soap/envelope/"><e:Body>]] ..
  [[<DebugAcquireLock xmlns="urn:tarnd3"><target moType="tarn.LockStresser">lock-stresser</target>]] ..
  [[<objects moType="VirtualMachine">vm-1</objects><objects moType="VirtualMachine">vm-2</objects>]] ..
  [[<mode>x</mode><holdDurationMillis>0</holdDurationMillis><iters>1</iters>]] ..
  [[<durationBetweenItersMillis>0</durationBetweenItersMillis></DebugAcquireLock></e:Body></e:Envelope>]]

local threads = {}

function setup(thread)
  table.insert(threads, thread)
end

function init()
  refused = 0
end

function response(status)
  if status ~= 200 then refused = refused + 1 end
end

function done()
  local total = 0
  for _, thread in ipairs(threads) do total = total + thread:get("refused") end
  io.write(string.format("answers other than 200: %d\n", total))
end

-- What a person does in Neovim: sees a problem, has it mended, jumps, renames, completes and formats. Ends
-- with 1, and says why, when something does not become so.

local policy = os.getenv("POLICY")

local function expect(what, is_so)
  if not vim.wait(15000, is_so, 20) then
    io.stderr:write("not so: " .. what .. "\n" .. vim.api.nvim_exec("messages", true) .. "\n")
    vim.cmd("cquit 1")
  end
end

local function open(path)
  vim.cmd("edit " .. vim.fn.fnameescape(policy .. "/" .. path))
end

local function line(number)
  return vim.api.nvim_buf_get_lines(0, number - 1, number, false)[1]
end

local function is_at(path)
  return vim.api.nvim_buf_get_name(0) == policy .. "/" .. path
end

local function codes()
  return table.concat(vim.tbl_map(function(each) return each.code end, vim.diagnostic.get(0)), " ")
end

open("domains/webDom")
expect("the type of the file is known", function() return vim.bo.filetype == "secpolicy" end)
expect("its syntax is known", function()
  return vim.fn.synIDattr(vim.fn.synID(3, 1, 1), "name") == "secpolicyKind"
end)
expect("the problem is told", function() return codes() == "unknown-word" end)

vim.ui.select = function(items, options, choose)
  for index, item in ipairs(items) do
    if options.format_item(item) == "Write 'webContent' instead" then choose(item, index) end
  end
end
vim.api.nvim_win_set_cursor(0, { 4, 5 })
vim.lsp.buf.code_action()
expect("the problem is mended", function()
  return line(4) == "-a webContent read    grant" and codes() == ""
end)

vim.lsp.buf.definition()
expect("the object's line is shown", function()
  return is_at("objects/base") and vim.api.nvim_win_get_cursor(0)[1] == 2
end)

open("domains/hostDom")
vim.api.nvim_win_set_cursor(0, { 2, 5 })
vim.lsp.buf.rename("httpProgram")
expect("the label is renamed", function()
  return line(2):match("^%-d httpProgram +webDom exec grant$") ~= nil
end)
vim.cmd("wall")
vim.api.nvim_win_set_cursor(0, { 2, 16 })
vim.lsp.buf.rename("httpDom")
expect("the domain's file is renamed", function()
  return vim.fn.filereadable(policy .. "/domains/httpDom") == 1
    and vim.fn.filereadable(policy .. "/domains/webDom") == 0
    and line(2):match("^%-d httpProgram +httpDom exec grant$") ~= nil
end)
vim.cmd("wall")

open("domains/httpDom")
expect("the renamed file has no problems", function() return codes() == "" and line(3):match("httpProgram") end)
vim.api.nvim_buf_set_lines(0, -1, -1, false, { "-c  cap_net_raw   grant", "-c cap_ki" })
vim.api.nvim_win_set_cursor(0, { vim.fn.line("$"), 8 })
local parameters = vim.lsp.util.make_position_params()
parameters.position.character = 9
local answers = vim.lsp.buf_request_sync(0, "textDocument/completion", parameters, 15000)
local _, answer = next(answers)
expect("words are offered", function() return #answer.result.items > 0 end)
vim.api.nvim_buf_set_lines(0, -2, -1, false, { "-c cap_kill grant" })
vim.lsp.buf.formatting_sync(nil, 15000)
expect("columns are aligned", function()
  local last = vim.fn.line("$")
  return line(last - 1) == "-c cap_net_raw grant" and line(last) == "-c cap_kill    grant"
end)
vim.cmd("wall")
expect("the policy is well", function() return codes() == "" end)
vim.cmd("qall")

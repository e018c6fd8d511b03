-- Policy files in Neovim 0.7 and later: put this file into ~/.config/nvim/plugin/. Syntax and file types are
-- those of ../vim, which go into ~/.config/nvim/ as they are.
--
-- Policies that are edited below a root directory other than / need it: vim.g.secpolicy_root = "/srv/root".

local function command()
  local words = { vim.g.secpolicy_command or "secpolicy" }
  if vim.g.secpolicy_root then
    vim.list_extend(words, { "--root", vim.g.secpolicy_root })
  end
  table.insert(words, "lsp")
  return vim.list_extend(words, vim.g.secpolicy_options or {})
end

-- The directory of the policy: the server finds it by itself, and this keeps one server for each.
local function policy_of(file)
  local dir = vim.fn.fnamemodify(file, ":p:h")
  while vim.fn.isdirectory(dir .. "/domains") == 0 and dir ~= "/" do
    dir = vim.fn.fnamemodify(dir, ":h")
  end
  return dir
end

local clients = {}

vim.api.nvim_create_autocmd("FileType", {
  pattern = "secpolicy",
  callback = function(event)
    local dir = policy_of(event.file)
    if not clients[dir] or vim.lsp.client_is_stopped(clients[dir]) then
      clients[dir] = vim.lsp.start_client({ name = "secpolicy", cmd = command(), root_dir = dir })
    end
    vim.lsp.buf_attach_client(event.buf, clients[dir])
    vim.bo[event.buf].omnifunc = "v:lua.vim.lsp.omnifunc"
    local function map(keys, action)
      vim.keymap.set("n", keys, action, { buffer = event.buf })
    end
    map("K", vim.lsp.buf.hover)
    map("gd", vim.lsp.buf.definition)
    map("gr", vim.lsp.buf.references)
    map("<F2>", vim.lsp.buf.rename)
    map("<F3>", vim.lsp.buf.formatting or function() vim.lsp.buf.format() end)
    map("<F4>", vim.lsp.buf.code_action)
  end,
})

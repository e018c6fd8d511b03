;;; secpolicy.el --- policy files of libsecpolicy -*- lexical-binding: t -*-

;; Put this file into a directory of `load-path' and (require 'secpolicy) into the init file. Eglot, which
;; Emacs 29 has, starts the server; M-x eglot in a policy file, or:
;;   (add-hook 'secpolicy-mode-hook #'eglot-ensure)
;; Policies that are edited below a root directory other than / need it:
;;   (setq secpolicy-command '("secpolicy" "--root" "/srv/root" "lsp"))

;;; Code:

(defvar secpolicy-command '("secpolicy" "lsp")
  "How the language server is started.")

(defconst secpolicy-keywords
  '(("^ *\\(-[acdfprsuE]\\)\\(?: \\|$\\)" 1 font-lock-keyword-face)
    (" \\(grant\\|revoke\\) *\\(?:#\\|$\\)" 1 font-lock-builtin-face)
    ("\\_<cap_[a-z_]+" . font-lock-constant-face)
    ("@[a-z]+" . font-lock-function-name-face)
    ("\\(?: \\|^\\)\\(/[^ #\n]*\\)" 1 font-lock-string-face)
    ("\t" . font-lock-warning-face))
  "What `secpolicy-mode' shows.")

;;;###autoload
(define-derived-mode secpolicy-mode prog-mode "Policy"
  "Mode for the files of a security policy."
  (modify-syntax-entry ?# "<")
  (modify-syntax-entry ?\n ">")
  (setq-local comment-start "# ")
  (setq-local indent-tabs-mode nil)
  (setq-local require-final-newline t)
  (setq-local font-lock-defaults '(secpolicy-keywords)))

(defun secpolicy-is-policy (file)
  "Whether FILE lies in a directory of a policy."
  (and file
       (string-match "\\`\\(.*?/\\)\\(?:early/domains\\|domains\\(?:/plugins\\)?\\|objects\\|fileLabels\\|tardisks\\)/[^/]+\\'"
                     file)
       (let ((root (match-string 1 file)))
         (and (file-directory-p (concat root "domains"))
              (file-directory-p (concat root "objects"))))))

;; By where they lie: the names of policy files tell nothing.
(add-to-list 'magic-mode-alist
             (cons (lambda () (secpolicy-is-policy buffer-file-name)) #'secpolicy-mode))

;; One server for all files of a policy.
(defun secpolicy-project (dir)
  "The project that DIR belongs to when it is one of a policy."
  (let ((root (locate-dominating-file dir "objects")))
    (and root
         (file-directory-p (expand-file-name "domains" root))
         (cons 'transient root))))

(add-hook 'project-find-functions #'secpolicy-project)

;; Of a package that is there when the form below is run.
(defvar eglot-server-programs)
(with-eval-after-load 'eglot
  (add-to-list 'eglot-server-programs
               (cons 'secpolicy-mode (lambda (&rest _) secpolicy-command))))

(provide 'secpolicy)
;;; secpolicy.el ends here

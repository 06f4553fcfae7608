<?php
// The measured file from php-cgi.
header('Content-Type: application/octet-stream');
header('Content-Length: ' . filesize('/var/tmp/zova-bench-transfers/file'));
readfile('/var/tmp/zova-bench-transfers/file');

#!/usr/bin/php-cgi
<?php
// The same answer from php-cgi.
header('Content-type: application/json; charset="UTF-8"');
header('X-Content-Type-Options: nosniff');
header('X-XSS-Protection: 1; mode=block');
header('Cache-Control: max-age=0, no-cache, no-store, must-revalidate');
header('Pragma: no-cache');
header('Expires: 0');
echo json_encode(['data' => ['greeting' => 'Hello, ' . $_GET['name']], 'success' => true]);

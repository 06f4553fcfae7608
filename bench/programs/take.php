<?php
// An upload in php-cgi, which removes the file at its end as front.cgi does.
echo json_encode(['folder' => dirname($_FILES['file']['tmp_name']), 'size' => $_FILES['file']['size']]);
